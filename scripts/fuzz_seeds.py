#!/usr/bin/env python3
"""Seed corpora for the fuzz targets in tests/fuzz, built from the bundled
vectors in tests/data.

    scripts/fuzz_seeds.py OUTDIR

writes OUTDIR/corpus-fuzz_decoder_fuzz and OUTDIR/corpus-fuzz_encoder_api_fuzz
(the directories the CI fuzz stage passes to each target).  Existing files are
kept, so a corpus grown by earlier runs stays.
"""
import hashlib
import pathlib
import struct
import sys

ROOT = pathlib.Path(__file__).resolve().parent.parent
DATA = ROOT / "tests" / "data"
AMR_MAGIC = b"#!AMR\n"
# Whole frame sizes by frame type, table-of-contents byte included; a reader
# steps over types 12 to 14 by one byte, as the decoder does.
FRAME_BYTES = [13, 14, 16, 18, 20, 21, 27, 32, 6, 7, 6, 6, 1, 1, 1, 1]


def write(outdir, data):
    outdir.mkdir(parents=True, exist_ok=True)
    (outdir / hashlib.sha1(data).hexdigest()).write_bytes(data)


def frames(stream):
    pos = 0
    while pos < len(stream):
        n = FRAME_BYTES[(stream[pos] >> 3) & 15]
        yield stream[pos:pos + n]
        pos += n


def decoder_seeds(outdir):
    # Byte 0: bits 0-2 sample format, bits 3-5 channel setting, bit 6 layout.
    configs = [0x48, 0x50, 0x09, 0x13, 0x42, 0x4A, 0x11]
    count = 0
    for i, path in enumerate(sorted(DATA.glob("vectors/**/*.amr"))):
        stream = path.read_bytes()
        if stream.startswith(AMR_MAGIC):
            stream = stream[len(AMR_MAGIC):]
        chunk, chunks = b"", []
        for f in frames(stream):
            if len(chunk) + len(f) > 1000:
                chunks.append(chunk)
                chunk = b""
            chunk += f
        chunks.append(chunk)
        # The start of every stream and one chunk from its middle.
        for j, c in enumerate({0: chunks[0], 1: chunks[len(chunks) // 2]}.values()):
            write(outdir, bytes([configs[(i + j) % len(configs)]]) + c)
            count += 1
    return count


def config_byte(value):
    # The encoder target maps a byte b below 0xF0 to b % 12 - 1.
    return bytes([value + 1])


def encoder_seeds(outdir):
    pcm_files = sorted(DATA.glob("corpus/*.pcm")) + [DATA / "vectors/3gpp/spch_dos_input.pcm"]
    # (dtx, vad_option, decoder layout, channels, format)
    settings = [(0, 0, 1, 1, 0), (1, 0, 1, 1, 0), (1, 1, 0, 2, 3), (0, 0, 0, 1, 1), (1, 1, 1, 2, 2)]
    count = 0
    for i, path in enumerate(pcm_files):
        pcm = path.read_bytes()
        nframes = len(pcm) // 320
        for mode in range(8):
            dtx, vad, layout, channels, fmt = settings[(i + mode) % len(settings)]
            head = b"".join(config_byte(v) for v in (dtx, 0, vad, mode, 0, layout, channels, fmt))
            start = (mode * 37 + i * 11) % max(1, nframes - 12)
            body = b""
            for k in range(min(12, nframes)):
                frame = pcm[(start + k) * 320:(start + k + 1) * 320]
                if k == 6:
                    # One mode switch half-way, to the next mode up.
                    body += bytes([0xF4, 24, (mode + 1) % 8]) + frame
                else:
                    body += bytes([0xF0, 24]) + frame
            write(outdir, head + body)
            count += 1
    # Rails and silence, with short output buffers.
    rails = bytes([0xF1, 24, 0, 0x51, 2, 0xF1, 24, 4, 0x02, 0xF3, 24, 0x01, 3])
    for mode in range(8):
        write(outdir, b"".join(config_byte(v) for v in (1, 0, mode % 2, mode, 0, 1, 1, 0)) + rails)
        count += 1
    return count


def main():
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    out = pathlib.Path(sys.argv[1])
    nd = decoder_seeds(out / "corpus-fuzz_decoder_fuzz")
    ne = encoder_seeds(out / "corpus-fuzz_encoder_api_fuzz")
    print(f"fuzz seeds: {nd} decoder, {ne} encoder/API inputs in {out}")


if __name__ == "__main__":
    main()
