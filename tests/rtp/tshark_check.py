#!/usr/bin/env python3
"""Independent reading of our RTP packets: every bundled stream, joined into
one .amr file, is sent through the example program as a pcap in both payload
modes; Wireshark's AMR dissector must report for every packet the CMR and,
for every frame, the frame type and quality bit that the stream holds, with
no protocol warning.  The example's receive direction must give the stream
back byte for byte.

usage: tshark_check.py <amr_rtp_pcap> <source dir> <work dir>
Without tshark only the example's round trip is checked, and the test exits
77 (skipped) if that passed.
"""
import pathlib
import shutil
import subprocess
import sys

SIZES = [13, 14, 16, 18, 20, 21, 27, 32, 6, 7, 6, 6, 0, 0, 0, 1]


def frames_of(data):
    pos, out = 6, []
    while pos < len(data):
        ft = (data[pos] >> 3) & 15
        size = max(1, SIZES[ft])
        frame = data[pos:pos + size]
        # The reserved types cannot travel over RTP; senders put NO_DATA there.
        out.append(b"\x7c" if 12 <= ft <= 14 else frame)
        pos += size
    assert pos == len(data), "stream ends inside a frame"
    return out


def main():
    have_tshark = shutil.which("tshark") is not None
    tool, src, work = sys.argv[1], pathlib.Path(sys.argv[2]), pathlib.Path(sys.argv[3])
    work.mkdir(parents=True, exist_ok=True)
    streams = sorted((src / "tests/data/vectors").rglob("*.amr"))
    frames = [f for s in streams for f in frames_of(s.read_bytes())]
    joined = work / "joined.amr"
    joined.write_bytes(b"#!AMR\n" + b"".join(frames))

    failures = 0
    for name, flags, per, pref in (("bandwidth-efficient", [], 3, "RFC 3267 BW-efficient"),
                                   ("octet-aligned", ["-o"], 10, "RFC 3267 octet aligned")):
        pcap = work / f"{name}.pcap"
        subprocess.run([tool, "send", *flags, "-n", str(per), joined, pcap], check=True)
        back = work / f"{name}.amr"
        subprocess.run([tool, "receive", *flags, pcap, back], check=True)
        if back.read_bytes() != joined.read_bytes():
            print(f"{name}: receive did not give the stream back")
            failures += 1
        if not have_tshark:
            continue

        out = subprocess.run(
            ["tshark", "-r", pcap, "-d", "udp.port==5004,rtp", "-d", "rtp.pt==97,amr",
             "-o", f"amr.encoding.version:{pref}", "-o", "amr.mode:Narrowband AMR",
             "-T", "fields",
             "-e", "amr.nb.cmr", "-e", "amr.nb.toc.ft", "-e", "amr.toc.q", "-e", "_ws.expert"],
            check=True, capture_output=True, text=True).stdout.splitlines()
        # Packets of NO_DATA frames alone are not sent, but for the last.
        expected = [frames[i:i + per] for i in range(0, len(frames), per)]
        expected = [g for k, g in enumerate(expected)
                    if k == len(expected) - 1 or any(f != b"\x7c" for f in g)]
        if len(out) != len(expected):
            print(f"{name}: tshark read {len(out)} packets, {len(expected)} sent")
            failures += 1
        bad = 0
        for k, (line, group) in enumerate(zip(out, expected)):
            cmr, ft, q, expert = (line.split("\t") + [""] * 4)[:4]
            want_ft = ",".join(str((f[0] >> 3) & 15) for f in group)
            want_q = ",".join(str((f[0] >> 2) & 1) for f in group)
            if (cmr, ft, q, expert) != ("15", want_ft, want_q, ""):
                if bad < 5:
                    print(f"{name}: packet {k}: tshark {line!r}, expected 15/{want_ft}/{want_q}")
                bad += 1
        failures += bad
        print(f"{name}: {len(out)} packets, {len(frames)} frames of {len(streams)} streams, "
              f"{per} per packet: {'all' if not bad else len(out) - bad} agree with tshark")
    if failures:
        return 1
    if not have_tshark:
        print("tshark not installed: the round trip passed, the dissector check was skipped")
        return 77
    return 0


if __name__ == "__main__":
    sys.exit(main())
