"""Tests of the vamrnb package against the bundled reference vectors
(tests/data), and of what it does with bad input, threads and long runs."""

import io
import os
import resource
import subprocess
import tracemalloc
import warnings
import wave
import zlib
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path

import numpy as np
import pytest

import vamrnb

DATA = Path(__file__).resolve().parents[2] / "tests" / "data"
VECTORS = DATA / "vectors"
ITEMS = sorted(p.stem for p in (DATA / "corpus").glob("*.pcm"))
MODE_IDS = ("MR475", "MR515", "MR59", "MR67", "MR74", "MR795", "MR102", "MR122")
CONFIGS = {"nodtx": {}, "vad1": {"dtx": True, "vad": 1}, "vad2": {"dtx": True, "vad": 2}}


def pcm(path):
    return np.frombuffer(Path(path).read_bytes(), "<i2")


def frame_crcs(samples):
    data = samples.astype("<i2").tobytes()
    return [zlib.crc32(data[i:i + 320]) for i in range(0, len(data), 320)]


def decoder_cases():
    """(stream, expected per-frame CRCs) for every decoder vector."""
    cases = [(VECTORS / "enc" / crc.parent.name / (crc.stem + ".amr"), crc)
             for crc in sorted((VECTORS / "dec").glob("*/*.crc"))]
    cases += [(crc.with_suffix(".amr"), crc) for crc in sorted((VECTORS / "err").glob("*/*.crc"))]
    cases += [(crc.with_suffix(".amr"), crc) for crc in sorted((VECTORS / "3gpp").glob("*.crc"))]
    return cases


@pytest.mark.parametrize("amr,crc", decoder_cases(), ids=lambda p: str(p)[len(str(VECTORS)) + 1:])
def test_decode_matches_reference_crcs(amr, crc):
    samples, rate = vamrnb.decode(amr)
    assert rate == 8000 and samples.dtype == np.int16
    assert frame_crcs(samples) == list(np.frombuffer(crc.read_bytes(), "<u4"))


@pytest.mark.parametrize("item", ITEMS)
@pytest.mark.parametrize("config", CONFIGS)
def test_encode_matches_reference_streams(item, config):
    signal = pcm(DATA / "corpus" / f"{item}.pcm")
    whole = signal[:len(signal) // 160 * 160]
    for number, mode_id in enumerate(MODE_IDS):
        ref = (VECTORS / "enc" / item / f"{mode_id}_{config}.amr").read_bytes()
        assert vamrnb.encode(whole, 8000, vamrnb.MODES[number], **CONFIGS[config]) == ref, mode_id
    # The reference leaves a last partial frame out; encode pads it into one
    # more frame after the same stream.
    padded = vamrnb.encode(signal, 8000, "MR122", **CONFIGS[config])
    assert padded.startswith(ref)
    assert len(list(vamrnb.frames(padded))) == -(-len(signal) // 160)


def installation_modes():
    return [line.strip() for line in (VECTORS / "3gpp" / "modes.txt").read_text().split()]


@pytest.mark.parametrize("vad,name", [(1, "spch_dos"), (2, "spch_do2")])
def test_mode_switch_every_frame(vad, name):
    signal = pcm(VECTORS / "3gpp" / "spch_dos_input.pcm")
    enc = vamrnb.Encoder(mode="MR122", dtx=True, vad=vad)
    out = [b"#!AMR\n"]
    for i, mode in enumerate(installation_modes()):
        enc.mode = mode
        assert enc.mode == vamrnb.MODES[MODE_IDS.index(mode)]
        out.append(enc.encode(signal[i * 160:(i + 1) * 160]))
    assert b"".join(out) == (VECTORS / "3gpp" / f"{name}.amr").read_bytes()


@pytest.mark.parametrize("amr", sorted((VECTORS / "err").glob("*/*.amr")), ids=lambda p: p.stem)
def test_streaming_decoder_equals_decode(amr):
    whole, _ = vamrnb.decode(amr, dtype="float32")
    dec = vamrnb.Decoder(dtype="float32")
    parts = [dec.decode(f.data) for f in vamrnb.frames(amr)]
    assert np.array_equal(np.concatenate(parts), whole)
    assert np.array_equal(whole * 32768, vamrnb.decode(amr)[0])


def test_streaming_encoder_equals_encode():
    # Float input with DTX: the per-frame conversion must be the batch one.
    rng = np.random.default_rng(1)
    signal = pcm(DATA / "corpus" / f"{ITEMS[0]}.pcm")[:160 * 120] / 32768.0
    signal[40 * 160:80 * 160] = rng.normal(0, 1e-3, 40 * 160)
    enc = vamrnb.Encoder("5.9", dtx=True, vad=2)
    frames = [enc.encode(signal[i:i + 160]) for i in range(0, len(signal), 160)]
    assert b"#!AMR\n" + b"".join(frames) == vamrnb.encode(signal, 8000, "5.9", dtx=True, vad=2)


def test_lost_frames_and_reset():
    amr = VECTORS / "enc" / ITEMS[0] / "MR795_nodtx.amr"
    frames = [f.data for f in vamrnb.frames(amr)]
    dec = vamrnb.Decoder()
    concealed = [dec.decode(f) if i % 5 else dec.conceal() for i, f in enumerate(frames)]
    # A lost frame is a no-data frame to the codec.
    lost = bytearray(b"#!AMR\n")
    for i, f in enumerate(frames):
        lost += f if i % 5 else b"\x7c"
    assert np.array_equal(np.concatenate(concealed), vamrnb.decode(bytes(lost))[0])
    dec.reset()
    assert np.array_equal(np.concatenate([dec.decode(f) for f in frames]), vamrnb.decode(amr)[0])


def test_sources_and_info():
    amr = VECTORS / "err" / "dtx_it-IT_m_carlo_talkspurts_noise-bed" / "vad1_MR795_ft9-14.amr"
    data = amr.read_bytes()
    want = vamrnb.decode(amr)[0]
    for src in (str(amr), data, bytearray(data), memoryview(data), io.BytesIO(data),
                np.frombuffer(data, np.uint8)):
        assert np.array_equal(vamrnb.decode(src)[0], want)
    got = vamrnb.info(data)
    frames = list(vamrnb.frames(data))
    types = [f.type for f in frames]
    assert got["frames"] == len(want) // 160 == len(types) - types.count(10) - types.count(11)
    assert got["other"] == {t: types.count(t) for t in range(9, 15) if t in types}
    assert got["speech"] == {"MR795": types.count(5)}
    assert sum(got["sid_modes"].values()) == got["sid"] == types.count(8)
    assert got["size"] == len(data) and got["problem"] is None
    assert got["bitrate"] == pytest.approx((len(data) - 6) * 8 / got["duration"] / 1000)


def test_damaged_streams():
    data = (VECTORS / "enc" / ITEMS[0] / "MR122_nodtx.amr").read_bytes()
    # A bad header byte after ten frames: an error that names its offset.
    bad = data[:6 + 320] + b"\x83" + data[6 + 320:]
    with pytest.raises(vamrnb.Error, match="byte 326") as e:
        vamrnb.decode(bad)
    assert e.value.offset == 326 and isinstance(e.value, ValueError)
    assert len(list(zip(range(10), vamrnb.frames(bad)))) == 10
    assert vamrnb.info(bad)["frames"] == 10 and "byte 326" in vamrnb.info(bad)["problem"]
    # A truncated last frame: the whole frames, and a warning.
    with pytest.warns(UserWarning, match="truncated last frame at byte 326"):
        samples, _ = vamrnb.decode(data[:6 + 320 + 20])
    assert np.array_equal(samples, vamrnb.decode(data[:6 + 320])[0])
    # Random bytes behind the header decode or raise Error, nothing else.
    rng = np.random.default_rng(7)
    for _ in range(300):
        junk = b"#!AMR\n" + rng.integers(0, 256, int(rng.integers(1, 200)), np.uint8).tobytes()
        try:
            with warnings.catch_warnings():
                warnings.simplefilter("ignore")
                vamrnb.decode(junk)
        except vamrnb.Error:
            pass


def closed_file():
    f = io.BytesIO(b"#!AMR\n")
    f.close()
    return f


ONE_FRAME = np.zeros(160, np.int16)
BAD_CALLS = {
    "int32 audio": (TypeError, lambda: vamrnb.encode(np.zeros(320, np.int32), 8000)),
    "complex audio": (TypeError, lambda: vamrnb.encode(np.zeros(320, complex), 8000)),
    "empty audio": (ValueError, lambda: vamrnb.encode(np.zeros(0, np.float32), 8000)),
    "NaN": (ValueError, lambda: vamrnb.encode(np.full(320, np.nan), 16000)),
    "inf frame": (ValueError, lambda: vamrnb.Encoder().encode(np.full(160, np.inf))),
    "3-D audio": (ValueError, lambda: vamrnb.encode(np.zeros((2, 2, 160)), 8000)),
    "rate 0": (ValueError, lambda: vamrnb.encode(ONE_FRAME, 0)),
    "rate str": (TypeError, lambda: vamrnb.encode(ONE_FRAME, "8000")),
    "mode 13": (ValueError, lambda: vamrnb.encode(ONE_FRAME, 8000, mode="13.0")),
    "mode 8": (ValueError, lambda: vamrnb.Encoder(mode=8)),
    "mode float": (TypeError, lambda: vamrnb.Encoder(mode=12.2)),
    "vad 3": (ValueError, lambda: vamrnb.Encoder(dtx=True, vad=3)),
    "short frame": (ValueError, lambda: vamrnb.Encoder().encode(ONE_FRAME[:159])),
    "2-D frame": (ValueError, lambda: vamrnb.Encoder().encode(ONE_FRAME.reshape(2, 80))),
    "frame size": (ValueError, lambda: vamrnb.Decoder().decode(b"\x3c" + bytes(30))),
    "empty frame": (ValueError, lambda: vamrnb.Decoder().decode(b"")),
    "frame header": (vamrnb.Error, lambda: vamrnb.Decoder().decode(b"\x80")),
    "str frame": (TypeError, lambda: vamrnb.Decoder().decode("\x7c")),
    "dtype": (ValueError, lambda: vamrnb.decode(b"#!AMR\n", dtype="float64")),
    "garbage": (vamrnb.Error, lambda: vamrnb.decode(b"RIFF\x24\0\0\0WAVEfmt ")),
    "empty stream": (vamrnb.Error, lambda: vamrnb.decode(b"")),
    "AMR-WB": (vamrnb.Error, lambda: vamrnb.decode(b"#!AMR-WB\n\x04" + bytes(17))),
    "closed file": (ValueError, lambda: vamrnb.decode(closed_file())),
    "text file": (TypeError, lambda: vamrnb.decode(io.StringIO("#!AMR\n"))),
    "int source": (TypeError, lambda: vamrnb.info(42)),
    "missing file": (FileNotFoundError, lambda: vamrnb.frames("/nonexistent.amr")),
}


@pytest.mark.parametrize("name", BAD_CALLS)
def test_bad_input_raises(name):
    error, call = BAD_CALLS[name]
    with pytest.raises(error):
        call()


def test_mode_names_and_mixdown():
    signal = pcm(DATA / "corpus" / f"{ITEMS[0]}.pcm")[:1600]
    ref = vamrnb.encode(signal, 8000, "MR67")
    for name in ("6.7", "6.70", "mr67", " MR67 ", "67", "3", 3, np.int64(3), "6.7kbps"):
        assert vamrnb.encode(signal, 8000, name) == ref, name
    # Equal channels mix down to the signal itself, in integers and floats.
    assert vamrnb.encode(np.stack([signal, signal], axis=1), 8000, 3) == ref
    assert vamrnb.encode(np.stack([signal, signal], 1) / np.float32(32768), 8000, 3) == ref


@pytest.mark.skipif(not os.access(os.environ.get("VAMRNB_TOOL", ""), os.X_OK),
                    reason="command-line tool not built (VAMRNB_TOOL)")
@pytest.mark.parametrize("rate,channels", [(16000, 1), (44100, 2)])
def test_resampling_matches_tool(tmp_path, rate, channels):
    rng = np.random.default_rng(rate)
    t = np.arange(rate) / rate
    tone = 0.3 * np.sin(2 * np.pi * 440 * t)[:, None] + rng.normal(0, 0.01, (rate, channels))
    audio = np.round(tone * 32767).astype(np.int16)
    with wave.open(str(tmp_path / "in.wav"), "wb") as w:
        w.setnchannels(channels)
        w.setsampwidth(2)
        w.setframerate(rate)
        w.writeframes(audio.tobytes())
    subprocess.run([os.environ["VAMRNB_TOOL"], "encode", "-q", "-m", "7.4", str(tmp_path / "in.wav"),
                    str(tmp_path / "out.amr")], check=True)
    got = vamrnb.encode(audio if channels > 1 else audio[:, 0], rate, "7.4")
    assert got == (tmp_path / "out.amr").read_bytes()


def test_threads_give_serial_results():
    signal = pcm(DATA / "corpus" / f"{ITEMS[0]}.pcm")
    streams = [VECTORS / "enc" / ITEMS[0] / f"{m}_vad{1 + i % 2}.amr" for i, m in enumerate(MODE_IDS)]

    def work(i):
        return (vamrnb.encode(signal, 8000, i, dtx=i % 2 == 1, vad=1 + i // 4),
                frame_crcs(vamrnb.decode(streams[i])[0]))

    serial = [work(i) for i in range(8)]
    with ThreadPoolExecutor(8) as pool:
        for _ in range(3):
            assert list(pool.map(work, range(8))) == serial


def rss_kib():
    with open("/proc/self/statm") as f:
        return int(f.read().split()[1]) * resource.getpagesize() // 1024


def test_no_leak_over_100000_frames():
    speech = pcm(DATA / "corpus" / f"{ITEMS[0]}.pcm")[:160 * 10]
    silence = np.zeros(160 * 100, np.int16)
    frames = [f.data for f in vamrnb.frames(vamrnb.encode(speech, 8000, "4.75"))] * 10

    def run(rounds):
        # Each round: 10 frames each way through the whole-file calls, and
        # 100 each way through new streaming objects.
        for _ in range(rounds):
            vamrnb.decode(vamrnb.encode(speech, 8000, "4.75"))
            enc, dec = vamrnb.Encoder("4.75", dtx=True), vamrnb.Decoder()
            for i in range(0, len(silence), 160):
                enc.encode(silence[i:i + 160])
            for f in frames:
                dec.decode(f)

    run(20)
    tracemalloc.start()
    before_py, before_rss = tracemalloc.get_traced_memory()[0], rss_kib()
    run(455)  # 455 x 220 = 100,100 frames
    after_py = tracemalloc.get_traced_memory()[0]
    tracemalloc.stop()
    assert after_py - before_py < 64 * 1024
    assert rss_kib() - before_rss < 1024
