#!/usr/bin/python3
"""Frames per second of vamrnb.decode / vamrnb.encode from Python against the
C API coding the same file in memory (bench/whole_file_bench.cpp), and the
overhead of the Python package in per cent.

    cmake -S . -B build -DVAMRNB_BUILD_BENCH=ON && cmake --build build -j2
    PYTHONPATH=build/python bench/python_bench.py [--c-bench build/bench/bench_whole_file_bench]

The input is a minute of speech (the bundled 3GPP test sequence repeated),
encoded at 12.2 kbit/s without DTX for the decoder.  Both sides count
processor time: Python figures are the median of repeated whole-file calls,
the C figures Google Benchmark's mean.
"""

import argparse
import json
import os
import statistics
import subprocess
import sys
import tempfile
import time
from pathlib import Path

import numpy as np

import vamrnb

ROOT = Path(__file__).resolve().parents[1]
SPEECH = ROOT / "tests" / "data" / "vectors" / "3gpp" / "spch_dos_input.pcm"


def python_fps(call, frames, seconds):
    # Processor time, as Google Benchmark's rates use: on a shared machine it
    # does not count the time other processes take.
    times = []
    deadline = time.process_time() + seconds
    while len(times) < 3 or time.process_time() < deadline:
        start = time.process_time()
        call()
        times.append(time.process_time() - start)
    return frames / statistics.median(times)


def c_fps(binary, amr, pcm, seconds):
    env = dict(os.environ, VAMRNB_BENCH_AMR=str(amr), VAMRNB_BENCH_PCM=str(pcm))
    out = subprocess.run([str(binary), "--benchmark_format=json",
                          f"--benchmark_min_time={seconds}"],
                         env=env, check=True, capture_output=True, text=True).stdout
    return {b["name"]: b["frames/s"] for b in json.loads(out)["benchmarks"]}


def main():
    ap = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    ap.add_argument("--c-bench", default=ROOT / "build" / "bench" / "bench_whole_file_bench",
                    type=Path, help="the C API benchmark (bench_whole_file_bench)")
    ap.add_argument("--seconds", type=float, default=3.0, help="time per measurement")
    args = ap.parse_args()

    speech = np.frombuffer(SPEECH.read_bytes(), "<i2")
    signal = np.resize(speech, 3000 * 160)  # 60 s
    stream = vamrnb.encode(signal, 8000, "12.2")
    frames = len(signal) // 160

    with tempfile.TemporaryDirectory() as tmp:
        amr, pcm = Path(tmp) / "in.amr", Path(tmp) / "in.pcm"
        amr.write_bytes(stream)
        pcm.write_bytes(signal.astype("<i2").tobytes())
        c = c_fps(args.c_bench, amr, pcm, args.seconds) if args.c_bench.exists() else {}
    py = {
        "BM_DecodeFile": python_fps(lambda: vamrnb.decode(stream), frames, args.seconds),
        "BM_EncodeFile": python_fps(lambda: vamrnb.encode(signal, 8000, "12.2"), frames,
                                    args.seconds),
    }
    print(f"{frames} frames (60 s of speech, MR122); frames per second")
    print(f"{'':10} {'C API':>10} {'Python':>10} {'overhead':>9}")
    for name, label in (("BM_DecodeFile", "decode"), ("BM_EncodeFile", "encode")):
        if name in c:
            print(f"{label:10} {c[name]:10.0f} {py[name]:10.0f} {100 * (c[name] / py[name] - 1):8.1f}%")
        else:
            print(f"{label:10} {'-':>10} {py[name]:10.0f}   (C benchmark not built: {args.c_bench})")
    return 0


if __name__ == "__main__":
    sys.exit(main())
