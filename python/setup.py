"""Builds the vamrnb extension from the library's own sources (the C++ files
under ../src, with the same vector kernels and run-time CPU dispatch as the
CMake build) and links libsoxr for resampling.  All metadata is in
pyproject.toml."""

import os
import subprocess
from pathlib import Path

from pybind11.setup_helpers import ParallelCompile, Pybind11Extension
from setuptools import setup

HERE = Path(__file__).resolve().parent
ROOT = HERE.parent  # the library's checkout


def pkg_config(flag: str, package: str) -> list:
    try:
        out = subprocess.run(["pkg-config", flag, package], check=True, capture_output=True,
                             text=True).stdout
    except (OSError, subprocess.CalledProcessError):
        return []
    return out.split()


def relative(paths):
    # setuptools wants source paths relative to this directory.
    return sorted(os.path.relpath(p, HERE) for p in paths)


soxr_libs = [f[2:] for f in pkg_config("--libs-only-l", "soxr")] or ["soxr"]
ext = Pybind11Extension(
    "vamrnb._vamrnb",
    relative([HERE / "src" / "_vamrnb.cpp", *(ROOT / "src").rglob("*.cpp")]),
    include_dirs=[str(ROOT / "include"), str(ROOT / "src")],
    libraries=soxr_libs,
    extra_compile_args=["-O2", "-fvisibility=hidden", "-fno-semantic-interposition",
                        *pkg_config("--cflags", "soxr")],
    cxx_std=20,
)

ParallelCompile("VAMRNB_BUILD_JOBS", default=2).install()
setup(ext_modules=[ext])
