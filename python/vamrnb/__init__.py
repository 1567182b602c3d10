"""AMR narrowband (AMR-NB) speech coding with NumPy arrays.

Decodes AMR files (the ``#!AMR\\n`` storage format) to arrays of 8 kHz
samples and encodes arrays at any sample rate to AMR files, in every codec
mode, with or without discontinuous transmission (DTX).  The codec is the
vamrnb library, bit-exact with the 3GPP fixed-point reference.

>>> import vamrnb
>>> audio, rate = vamrnb.decode("call.amr")           # int16 array, 8000
>>> amr = vamrnb.encode(audio, rate, mode="7.95", dtx=True)

``Encoder`` and ``Decoder`` code one 20 ms frame (160 samples) at a time for
streaming use; ``frames`` and ``info`` look into a stream without decoding it.
The interpreter lock is released while the codec runs, so separate
``Encoder``/``Decoder`` objects, and calls to ``encode``/``decode``, run in
parallel from separate threads.
"""

from __future__ import annotations

import os
import warnings
from typing import Any, Dict, Iterator, NamedTuple, Optional, Tuple, Union

import numpy as np

from . import _vamrnb

__all__ = ["decode", "encode", "Encoder", "Decoder", "frames", "info", "Frame", "Error",
           "MODES", "SAMPLE_RATE", "FRAME_SAMPLES", "__version__"]

__version__ = _vamrnb.VERSION

#: Sample rate of every decoded signal and of the encoder's input, in Hz.
SAMPLE_RATE = 8000
#: Samples in one 20 ms frame.
FRAME_SAMPLES = 160
#: Codec modes by bit rate, index = mode number (MR475 .. MR122).
MODES = ("4.75", "5.15", "5.9", "6.7", "7.4", "7.95", "10.2", "12.2")

_FRAME_BYTES = _vamrnb.FRAME_BYTES
_MODE_IDS = ("MR475", "MR515", "MR59", "MR67", "MR74", "MR795", "MR102", "MR122")
# Every spelling the command-line tool accepts, lower case.
_MODE_BY_NAME: Dict[str, int] = {}
for _m, _rate in enumerate(MODES):
    _digits = _rate.replace(".", "")
    for _name in (_rate, "mr" + _digits, _digits, str(_m)):
        _MODE_BY_NAME[_name] = _m
    if len(_rate.split(".")[1]) == 1:
        _MODE_BY_NAME[_rate + "0"] = _m
del _m, _rate, _digits, _name


class Error(ValueError):
    """A damaged or unsupported AMR stream.

    ``offset`` is the byte offset in the stream where the problem was found.
    """

    def __init__(self, message: str, offset: int) -> None:
        super().__init__(f"{message} at byte {offset}")
        self.offset = offset


class Frame(NamedTuple):
    """One frame of a stream, as ``frames`` yields it."""

    #: Frame type 0..15: 0..7 speech in mode MR475..MR122, 8 comfort noise
    #: (SID), 15 no data, the others reserved or unused.
    type: int
    #: Quality bit: False marks a frame damaged in transmission.
    quality: bool
    #: The frame's bytes, table-of-contents byte included.
    data: bytes


def _mode_number(mode: Union[str, int]) -> int:
    if isinstance(mode, bool) or not isinstance(mode, (str, int, np.integer)):
        raise TypeError(f"mode must be a str such as '12.2' or 'MR122', or an int 0..7, "
                        f"not {type(mode).__name__}")
    if isinstance(mode, str):
        key = mode.strip().lower()
        for suffix in ("kbit/s", "kbps", "k"):
            if key.endswith(suffix) and len(key) > len(suffix):
                key = key[:-len(suffix)]
                break
        number = _MODE_BY_NAME.get(key)
        if number is not None:
            return number
    elif 0 <= mode <= 7:
        return int(mode)
    raise ValueError(f"unknown mode {mode!r}: use {', '.join(MODES)}, MR475..MR122 or 0..7")


def _vad_option(vad: int) -> int:
    if isinstance(vad, bool) or not isinstance(vad, (int, np.integer)):
        raise TypeError(f"vad must be 1 or 2, not {type(vad).__name__}")
    if vad not in (1, 2):
        raise ValueError(f"vad must be 1 or 2, not {vad}")
    return 1 if vad == 2 else 0  # the codec's switch: 1 selects detector 2


def _float_output(dtype: Any) -> bool:
    try:
        dt = np.dtype(dtype)
    except TypeError as e:
        raise TypeError(f"dtype must be int16 or float32, not {dtype!r}") from e
    if dt == np.int16:
        return False
    if dt == np.float32:
        return True
    raise ValueError(f"dtype must be int16 or float32, not {dt}")


Source = Union[str, "os.PathLike[str]", bytes, bytearray, memoryview, Any]


def _read(src: Source) -> Union[bytes, memoryview]:
    """The bytes of a path, a bytes-like object or a binary file object."""
    if isinstance(src, (str, os.PathLike)):
        with open(src, "rb") as f:
            return f.read()
    if isinstance(src, bytes):
        return src
    read = getattr(src, "read", None)
    if read is None:
        try:
            return memoryview(src).cast("B")
        except TypeError:
            raise TypeError("src must be a path, a bytes-like object or a binary file object, "
                            f"not {type(src).__name__}") from None
    if getattr(src, "closed", False):
        raise ValueError("src is a closed file")
    data = read()
    if isinstance(data, str):
        raise TypeError("src is a text file; open it in binary mode ('rb')")
    return data


def _ending(data: Union[bytes, memoryview], status: int, offset: int, complete: int) -> None:
    """Raises Error for a stream that ended badly, or warns about a truncated
    last frame; the walk over data reported status at offset."""
    if status == _vamrnb.STREAM_ERR_TRUNCATED:
        ft = (data[offset] >> 3) & 15
        warnings.warn(f"truncated last frame at byte {offset} (frame type {ft} needs "
                      f"{_FRAME_BYTES[ft]} bytes, {len(data) - offset} left); "
                      f"{complete} complete frames used", stacklevel=3)
    elif status < 0:
        if offset == 0 and not data:
            raise Error("empty stream", 0)
        raise Error(_vamrnb.strerror(status), offset)


def decode(src: Source, dtype: Any = "int16") -> Tuple[np.ndarray, int]:
    """Decodes a whole AMR-NB file.

    :param src: a path, a bytes-like object holding the file, or a binary file
        object (read to its end).
    :param dtype: ``"int16"`` (the codec's samples) or ``"float32"`` (the same
        samples divided by 32768, within -1.0..1.0).
    :return: ``(samples, 8000)``: a 1-D array of 160 samples per frame; frames
        of the unused types 10 and 11 give no samples.
    :raises Error: the data is not an AMR-NB file (AMR-WB and multi-channel
        files included), or a table-of-contents byte has its F bit set (the
        message and ``offset`` name the byte).
    :raises TypeError, ValueError: bad arguments.

    A truncated last frame is dropped with a warning; the complete frames are
    decoded.
    """
    as_float = _float_output(dtype)
    data = _read(src)
    samples, status, offset = _vamrnb.decode_stream(data, as_float)
    _ending(data, status, offset, len(samples) // FRAME_SAMPLES)
    return samples, SAMPLE_RATE


def _to_int16(x: np.ndarray) -> np.ndarray:
    """Float samples (full scale 1.0) to 16-bit, rounded and clipped."""
    return np.clip(np.rint(x * 32768.0), -32768, 32767).astype(np.int16)


def _checked_audio(audio: Any, what: str) -> np.ndarray:
    a = np.asarray(audio)
    if a.dtype.kind == "i" and a.dtype.itemsize == 2:
        a = a.astype(np.int16, copy=False)  # native byte order
    if a.dtype != np.int16 and not np.issubdtype(a.dtype, np.floating):
        raise TypeError(f"{what} must be int16 or floating point, not {a.dtype}")
    if a.dtype != np.int16 and not np.isfinite(a).all():
        raise ValueError(f"{what} contains NaN or infinite samples")
    return a


def _pcm8k(audio: Any, samplerate: Any) -> np.ndarray:
    """Any mono or multi-channel signal to 8 kHz mono 16-bit samples, as the
    command-line tool prepares its input."""
    a = _checked_audio(audio, "audio")
    if a.ndim not in (1, 2):
        raise ValueError(f"audio must be 1-D (mono) or 2-D (samples x channels), not {a.ndim}-D")
    if a.size == 0:
        raise ValueError("audio is empty")
    if isinstance(samplerate, bool) or not isinstance(samplerate, (int, float, np.integer,
                                                                   np.floating)):
        raise TypeError(f"samplerate must be a number, not {type(samplerate).__name__}")
    if not np.isfinite(samplerate) or samplerate <= 0:
        raise ValueError(f"samplerate must be positive, not {samplerate}")
    if samplerate == SAMPLE_RATE:
        if a.dtype == np.int16:
            if a.ndim == 1:
                return a
            # Mean of the channels, halves rounded away from zero.
            mean = a.astype(np.float64).mean(axis=1)
            return (np.sign(mean) * np.floor(np.abs(mean) + 0.5)).astype(np.int16)
        return _to_int16(a if a.ndim == 1 else a.mean(axis=1))
    x = a.astype(np.float32) / np.float32(32768) if a.dtype == np.int16 else a.astype(np.float32)
    if x.ndim == 2:
        x = x.mean(axis=1, dtype=np.float32)
    y = _vamrnb.resample(np.ascontiguousarray(x), float(samplerate))
    if y.size == 0:
        raise ValueError(f"audio is too short to give one sample at {SAMPLE_RATE} Hz")
    return _to_int16(y)


def encode(audio: Any, samplerate: Union[int, float], mode: Union[str, int] = "12.2",
           dtx: bool = False, vad: int = 1) -> bytes:
    """Encodes a signal into a complete AMR-NB file.

    :param audio: int16 samples, or floating-point samples with full scale
        1.0 (clipped beyond it); 1-D, or 2-D as (samples, channels), whose
        channels are mixed down to mono.
    :param samplerate: sample rate of ``audio`` in Hz; anything other than
        8000 is resampled to 8 kHz with libsoxr (high quality).
    :param mode: codec mode: ``"4.75"`` ... ``"12.2"``, ``"MR475"`` ...
        ``"MR122"`` or the mode number 0..7.
    :param dtx: discontinuous transmission: silence is sent as comfort-noise
        (SID) and no-data frames.
    :param vad: voice activity detector used with DTX, 1 or 2.
    :return: the file's bytes: the ``#!AMR\\n`` header and one frame per 160
        samples, the last partial frame padded with silence.
    :raises TypeError, ValueError: bad arguments, an empty signal, or NaN or
        infinite samples.
    """
    enc = _vamrnb.EncoderCore(_mode_number(mode), bool(dtx), _vad_option(vad))
    return enc.encode_stream(np.ascontiguousarray(_pcm8k(audio, samplerate)))


def _mode_name(number: int) -> str:
    return MODES[number]


class Encoder:
    """Encodes one 20 ms frame at a time, for streaming.

    ``Encoder(mode="12.2", dtx=False, vad=1)`` takes the arguments of
    ``encode``.  Frames are 160 samples at 8 kHz; the result of ``encode`` is
    one frame of the storage format (no file header: prepend ``b"#!AMR\\n"``
    to the first frame to make a file).  An object may be used from one thread
    at a time; separate objects run in parallel.
    """

    def __init__(self, mode: Union[str, int] = "12.2", dtx: bool = False, vad: int = 1) -> None:
        self._core = _vamrnb.EncoderCore(_mode_number(mode), bool(dtx), _vad_option(vad))
        self.dtx = bool(dtx)
        self.vad = int(vad)

    @property
    def mode(self) -> str:
        """The codec mode as its bit rate (``"12.2"``); set it by any mode name
        or number, effective from the next frame."""
        return _mode_name(self._core.mode)

    @mode.setter
    def mode(self, mode: Union[str, int]) -> None:
        self._core.mode = _mode_number(mode)

    def encode(self, frame: Any) -> bytes:
        """Encodes 160 samples (int16, or floating point with full scale 1.0).

        :param frame: one frame of 8 kHz mono samples, 1-D, exactly 160 long.
        :return: one storage-format frame: a table-of-contents byte and the
            frame's bits (1 to 32 bytes).
        """
        a = _checked_audio(frame, "frame")
        if a.shape != (FRAME_SAMPLES,):
            raise ValueError(f"frame must hold {FRAME_SAMPLES} samples (1-D), not shape {a.shape}")
        return self._core.encode(np.ascontiguousarray(a if a.dtype == np.int16 else _to_int16(a)))

    def __repr__(self) -> str:
        return f"Encoder(mode={self.mode!r}, dtx={self.dtx}, vad={self.vad})"


class Decoder:
    """Decodes one frame at a time, for streaming.

    ``Decoder(dtype="int16")``; ``dtype`` as for ``decode``.  Frames are
    storage-format frames (as ``frames`` yields or ``Encoder.encode``
    returns), without the file header.  An object may be used from one thread
    at a time; separate objects run in parallel.
    """

    def __init__(self, dtype: Any = "int16") -> None:
        self._float = _float_output(dtype)
        self._core = _vamrnb.DecoderCore()

    def decode(self, frame: Union[bytes, bytearray, memoryview]) -> np.ndarray:
        """Decodes one frame.

        :param frame: the frame's bytes, table-of-contents byte first, exactly
            as many as its frame type takes.
        :return: 160 samples, or none for the unused frame types 10 and 11.
        :raises Error: the first byte is not a valid table-of-contents byte.
        :raises ValueError: the size does not match the frame type.
        """
        if isinstance(frame, str) or not isinstance(frame, (bytes, bytearray, memoryview)):
            raise TypeError(f"frame must be bytes-like, not {type(frame).__name__}")
        data = frame if isinstance(frame, bytes) else memoryview(frame).cast("B")
        if len(data) == 0:
            raise ValueError("empty frame")
        if data[0] & 0x80:
            raise Error("invalid table-of-contents byte (F bit set)", 0)
        need = _FRAME_BYTES[(data[0] >> 3) & 15]
        if len(data) != need:
            raise ValueError(f"frame type {(data[0] >> 3) & 15} takes {need} bytes, "
                             f"not {len(data)}")
        return self._core.decode(data, self._float)

    def conceal(self) -> np.ndarray:
        """Reports a lost frame: returns 160 samples that conceal it (the
        decoder extrapolates speech or continues comfort noise)."""
        return self._core.decode(b"\x7c", self._float)

    def reset(self) -> None:
        """Returns the decoder to its initial state, for a new stream."""
        self._core.reset()

    def __repr__(self) -> str:
        return f"Decoder(dtype={'float32' if self._float else 'int16'!r})"


def frames(src: Source) -> Iterator[Frame]:
    """Iterates over the frames of an AMR-NB file.

    :param src: as for ``decode``.
    :return: an iterator of ``Frame(type, quality, data)``.
    :raises Error: not an AMR-NB file, or (after the frames before it) an
        invalid table-of-contents byte.  A truncated last frame ends the
        iteration with a warning.
    """
    data = _read(src)
    rows, status, offset = _vamrnb.walk_stream(data)
    if not rows and status != _vamrnb.STREAM_ERR_TRUNCATED:
        _ending(data, status, offset, 0)  # not a stream at all: fail at once

    def generate() -> Iterator[Frame]:
        for off, ft, q in rows:
            yield Frame(ft, q, bytes(data[off:off + _FRAME_BYTES[ft]]))
        _ending(data, status, offset, len(rows))

    return generate()


def info(src: Source) -> Dict[str, Any]:
    """Describes an AMR-NB file without decoding it (the fields of the
    command-line tool's ``info``).

    :param src: as for ``decode``.
    :return: a dict with ``duration`` (seconds of audio, 20 ms per frame that
        decodes), ``frames`` (frames that decode: all but types 10 and 11),
        ``bitrate`` (average kbit/s), ``size`` (bytes), ``speech`` (frames per
        mode, keyed ``"MR475"`` ... ``"MR122"``), ``sid`` (comfort-noise
        frames), ``sid_modes`` (their mode indications, keyed like
        ``speech``), ``no_data`` (type 15 frames), ``other`` (frames of the
        types 9 to 14, by type), ``bad`` (frames with the quality bit 0) and
        ``problem`` (None, or why the walk stopped early, with the byte
        offset: the counts cover the frames before it).
    :raises Error: not an AMR-NB file.
    """
    data = _read(src)
    rows, status, offset = _vamrnb.walk_stream(data)
    if not rows and status != _vamrnb.STREAM_ERR_TRUNCATED:
        _ending(data, status, offset, 0)
    by_type = [0] * 16
    sid_modes: Dict[str, int] = {}
    payload = bad = 0
    for off, ft, q in rows:
        by_type[ft] += 1
        bad += not q
        payload += _FRAME_BYTES[ft]
        if ft == 8:
            # Mode indication: three bits after the SID bits and the STI bit,
            # least significant first.
            last = data[off + 5]
            m = (last >> 3) & 1 | ((last >> 2) & 1) << 1 | ((last >> 1) & 1) << 2
            sid_modes[_MODE_IDS[m]] = sid_modes.get(_MODE_IDS[m], 0) + 1
    count = len(rows) - by_type[10] - by_type[11]
    duration = count * 0.02
    problem = None
    if status < 0:
        problem = f"{_vamrnb.strerror(status)} at byte {offset}"
    return {
        "duration": duration,
        "frames": count,
        "bitrate": payload * 8 / duration / 1000 if duration else 0.0,
        "size": len(data),
        "speech": {_MODE_IDS[m]: by_type[m] for m in range(8) if by_type[m]},
        "sid": by_type[8],
        "sid_modes": sid_modes,
        "no_data": by_type[15],
        "other": {t: by_type[t] for t in range(9, 15) if by_type[t]},
        "bad": bad,
        "problem": problem,
    }
