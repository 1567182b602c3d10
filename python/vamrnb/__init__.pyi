# Types of the vamrnb package's public interface; ctest's python_stubs test checks
# them against the compiled package with mypy's stubtest.
import os
from typing import IO, Any, Dict, Iterator, NamedTuple, Tuple, Union

import numpy as np
import numpy.typing as npt

__version__: str
SAMPLE_RATE: int
FRAME_SAMPLES: int
MODES: Tuple[str, ...]

Source = Union[str, os.PathLike[str], bytes, bytearray, memoryview, IO[bytes]]
_Mode = Union[str, int]
_DType = Union[str, type, np.dtype[Any]]

class Error(ValueError):
    offset: int
    def __init__(self, message: str, offset: int) -> None: ...

class Frame(NamedTuple):
    type: int
    quality: bool
    data: bytes

def decode(src: Source, dtype: _DType = ...) -> Tuple[npt.NDArray[Any], int]: ...
def encode(audio: npt.ArrayLike, samplerate: Union[int, float], mode: _Mode = ...,
           dtx: bool = ..., vad: int = ...) -> bytes: ...

class Encoder:
    dtx: bool
    vad: int
    def __init__(self, mode: _Mode = ..., dtx: bool = ..., vad: int = ...) -> None: ...
    @property
    def mode(self) -> str: ...
    @mode.setter
    def mode(self, mode: _Mode) -> None: ...
    def encode(self, frame: npt.ArrayLike) -> bytes: ...

class Decoder:
    def __init__(self, dtype: _DType = ...) -> None: ...
    def decode(self, frame: Union[bytes, bytearray, memoryview]) -> npt.NDArray[Any]: ...
    def conceal(self) -> npt.NDArray[Any]: ...
    def reset(self) -> None: ...

def frames(src: Source) -> Iterator[Frame]: ...
def info(src: Source) -> Dict[str, Any]: ...
