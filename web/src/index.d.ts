// Types of the vamrnb package (src/index.js).

/** The eight speech modes, by name; a mode may also be given as 0..7. */
export type ModeName = 'MR475' | 'MR515' | 'MR59' | 'MR67' | 'MR74' | 'MR795' | 'MR102' | 'MR122';
export type Mode = ModeName | 0 | 1 | 2 | 3 | 4 | 5 | 6 | 7;

export const MODES: readonly ModeName[];
/** Names of the frame types 0..15 of the table-of-contents byte. */
export const FRAME_TYPES: readonly string[];
/** Samples per 20 ms frame: 160. */
export const FRAME_SAMPLES: 160;
/** The codec's sample rate: 8000 Hz. */
export const SAMPLE_RATE: 8000;

/** Thrown for input that is not AMR-NB and other codec failures. */
export interface VamrnbError extends Error {
  /** The library's negative status value. */
  status: number;
}

/**
 * Loads the WebAssembly module (once).  The other entry points await it;
 * the Decoder and Encoder constructors need it loaded.
 * @param options.wasmBinary the module's bytes, when the caller fetches them
 */
export function ready(options?: { wasmBinary?: ArrayBuffer | Uint8Array }): Promise<void>;

/**
 * Decodes a whole .amr file, with or without its "#!AMR\n" header, to 8 kHz
 * samples; bad and lost frames are concealed.
 * @throws VamrnbError for input that is not AMR-NB (message says why)
 */
export function decode(amrBytes: Uint8Array | ArrayBuffer | ArrayBufferView): Promise<Int16Array>;

export interface EncodeOptions {
  /** Speech mode; default 'MR122'. */
  mode?: Mode;
  /** Discontinuous transmission (SID and no-data frames in pauses); default false. */
  dtx?: boolean;
  /** Voice activity detector used with DTX: 1 or 2; default 1. */
  vad?: 1 | 2;
  /** Rate of the samples; other rates than 8000 are resampled with OfflineAudioContext. */
  sampleRate?: number;
}

/**
 * Encodes a recording to a .amr file ("#!AMR\n" and the frames); a last
 * partial frame is completed with silence.  Float32 samples are in -1..1
 * (negative ones scaled by 32768, positive ones by 32767, as browsers decode
 * 16-bit audio files).
 */
export function encode(samples: Int16Array | Float32Array, options?: EncodeOptions): Promise<Uint8Array>;

export interface DecoderStats {
  /** Frames met, by frame type 0..15. */
  byType: number[];
  /** Frames met in all. */
  frames: number;
  /** Frames with the quality bit clear (concealed). */
  bad: number;
  /** Frames of types 10 and 11, which give no output. */
  refused: number;
  /** The input ended inside a frame (that frame was concealed). */
  truncated: boolean;
  /** 160-sample frames produced. */
  outputFrames: number;
}

/** Frame-by-frame decoder of a stream arriving in chunks. */
export class Decoder {
  /** Needs the module loaded (await ready()). */
  constructor();
  /** Samples of every frame the chunk completes. */
  push(chunk: Uint8Array | ArrayBuffer | ArrayBufferView): Int16Array;
  /** Ends the stream; samples still to come. */
  end(): Int16Array;
  /** Ready for a new stream. */
  reset(): void;
  readonly stats: DecoderStats;
  /** Releases the instance; later calls throw. */
  free(): void;
}

/** Frame-by-frame encoder of 8 kHz samples arriving in chunks. */
export class Encoder {
  /** Needs the module loaded (await ready()). */
  constructor(options?: Omit<EncodeOptions, 'sampleRate'>);
  /** Mode of the frames encoded from the next push on. */
  set mode(mode: Mode);
  /** Bytes of every frame the samples complete; the first call's start with "#!AMR\n". */
  push(samples: Int16Array | Float32Array): Uint8Array;
  /** Codes a last partial frame, completed with silence. */
  end(): Uint8Array;
  /** Frames written, by frame type (0..7 speech, 8 SID, 15 no data). */
  readonly stats: { byType: number[] };
  /** Releases the instance; later calls throw. */
  free(): void;
}

/** Bytes of the module's heap in use (a diagnostic for leak checks). */
export function heapInUse(): number;
