// vamrnb for JavaScript: AMR-NB decoding and encoding in WebAssembly, for
// browsers, workers and node.  The codec is the C library itself, compiled
// to dist/vamrnb_wasm.wasm; this file owns the module, moves bytes in and out of
// its memory and turns status values into thrown Errors.
import createVamrnbModule from '../dist/vamrnb_wasm.js';

const FRAME_SAMPLES = 160;
const SAMPLE_RATE = 8000;
export const MODES = ['MR475', 'MR515', 'MR59', 'MR67', 'MR74', 'MR795', 'MR102', 'MR122'];
// Names of the sixteen frame types of the table-of-contents byte.
export const FRAME_TYPES = [...MODES, 'SID', 'GSM-EFR SID', 'TDMA-EFR SID', 'PDC-EFR SID',
  'reserved 12', 'reserved 13', 'reserved 14', 'NO_DATA'];

let modulePromise = null;
let wasm = null;

// Loads the WebAssembly module once; every entry point awaits it.  Pass
// { wasmBinary } to supply the module's bytes yourself (e.g. from a bundler).
export function ready(options = {}) {
  if (!modulePromise) {
    modulePromise = (async () => {
      let wasmBinary = options.wasmBinary;
      const url = new URL('../dist/vamrnb_wasm.wasm', import.meta.url);
      if (!wasmBinary && url.protocol === 'file:') {
        const { readFile } = await import('node:fs/promises');
        wasmBinary = await readFile(url);
      }
      const m = await createVamrnbModule(wasmBinary ? { wasmBinary } : { locateFile: () => url.href });
      wasm = m;
      return m;
    })();
    modulePromise.catch(() => { modulePromise = null; });
  }
  return modulePromise.then(() => undefined);
}

function module() {
  if (!wasm) throw new Error('vamrnb: the module is not loaded yet; await ready() first');
  return wasm;
}

class VamrnbError extends Error {
  constructor(status, m) {
    super(`vamrnb: ${m.UTF8ToString(m._vamrnb_js_strerror(status))}`);
    this.name = 'VamrnbError';
    this.status = status;
  }
}

function check(status, m) {
  if (status < 0) throw new VamrnbError(status, m);
}

// Copies bytes into a temporary block of the module's heap for one call.
function withHeapCopy(m, bytes, fn) {
  if (bytes.byteLength === 0) return fn(0, 0);
  const ptr = m._vamrnb_js_alloc(bytes.byteLength);
  if (!ptr) throw new Error('vamrnb: out of memory');
  try {
    m.HEAPU8.set(new Uint8Array(bytes.buffer, bytes.byteOffset, bytes.byteLength), ptr);
    return fn(ptr, bytes.byteLength);
  } finally {
    m._vamrnb_js_free(ptr);
  }
}

const registry = typeof FinalizationRegistry === 'function'
  ? new FinalizationRegistry(({ m, del, handle }) => m[del](handle)) : null;

// Owns one glue handle: released by free(), or by the garbage collector as a
// last resort.
class Handle {
  constructor(m, handle, del) {
    this.m = m;
    this.handle = handle;
    this.del = del;
    registry?.register(this, { m, del, handle }, this);
  }

  get live() {
    if (!this.handle) throw new Error('vamrnb: used after free()');
    return this.handle;
  }

  free() {
    if (!this.handle) return;
    registry?.unregister(this);
    this.m[this.del](this.handle);
    this.handle = 0;
  }
}

// Float samples in -1..1 to 16 bits: negative values scaled by 32768,
// positive ones by 32767, the inverse of how browsers decode 16-bit audio
// files, so that a WAV file's samples come back exactly.
function toInt16(samples) {
  if (samples instanceof Int16Array) return samples;
  if (samples instanceof Float32Array) {
    const out = new Int16Array(samples.length);
    for (let i = 0; i < samples.length; i++) {
      const x = samples[i];
      const v = Math.round(x < 0 ? x * 32768 : x * 32767);
      out[i] = v > 32767 ? 32767 : v < -32768 ? -32768 : v;
    }
    return out;
  }
  throw new TypeError('vamrnb: samples must be an Int16Array or a Float32Array');
}

function toBytes(data) {
  if (data instanceof Uint8Array) return data;
  if (data instanceof ArrayBuffer) return new Uint8Array(data);
  if (ArrayBuffer.isView(data)) return new Uint8Array(data.buffer, data.byteOffset, data.byteLength);
  throw new TypeError('vamrnb: AMR data must be a Uint8Array, ArrayBuffer or typed array');
}

function modeIndex(mode) {
  const i = typeof mode === 'number' ? mode : MODES.indexOf(mode);
  if (!Number.isInteger(i) || i < 0 || i > 7) {
    throw new RangeError(`vamrnb: unknown mode ${mode}; use 0..7 or one of ${MODES.join(', ')}`);
  }
  return i;
}

const MAGIC = new TextEncoder().encode('#!AMR\n');

// Decodes a storage-format stream given in chunks of any size.  Input with the
// "#!AMR\n" header, or frames without it, is accepted; bad (Q = 0) and lost
// frames are concealed, a frame cut off at the end is concealed as lost.
export class Decoder extends Handle {
  constructor() {
    const m = module();
    const h = m._vamrnb_js_decoder_create();
    if (!h) throw new Error('vamrnb: out of memory');
    super(m, h, '_vamrnb_js_decoder_delete');
    this.headerless = null;  // decided by the first byte
  }

  // Returns the samples of every frame completed by these bytes.
  push(data) {
    const bytes = toBytes(data);
    const m = this.m;
    const h = this.live;
    if (bytes.byteLength === 0) return new Int16Array(0);
    if (this.headerless === null) {
      this.headerless = bytes[0] !== 0x23;  // '#': a header, checked by the reader
      if (this.headerless) withHeapCopy(m, MAGIC, (p, n) => check(m._vamrnb_js_decoder_push(h, p, n, 0), m));
    }
    check(withHeapCopy(m, bytes, (p, n) => m._vamrnb_js_decoder_push(h, p, n, this.headerless ? 1 : 0)), m);
    return this.#take();
  }

  // Ends the stream; returns the samples still to come.  Throws on input
  // that was empty or not AMR-NB; input without the header must end on a
  // frame boundary, input with it may end inside a frame (concealed).
  end() {
    const m = this.m;
    if (this.headerless === null) throw new VamrnbError(-20, m);
    check(m._vamrnb_js_decoder_finish(this.live, this.headerless ? 1 : 0), m);
    return this.#take();
  }

  // Ready for a new stream.
  reset() {
    this.m._vamrnb_js_decoder_reset(this.live);
    this.headerless = null;
  }

  // Frames seen so far: per frame type, bad (Q = 0), refused (types 10 and
  // 11, no output), whether the input ended inside a frame, output frames.
  get stats() {
    const m = this.m;
    const h = this.live;
    const byType = Array.from({ length: 16 }, (_, i) => m._vamrnb_js_decoder_stat(h, i));
    return {
      byType,
      frames: byType.reduce((a, b) => a + b, 0),
      bad: m._vamrnb_js_decoder_stat(h, 16),
      refused: m._vamrnb_js_decoder_stat(h, 17),
      truncated: m._vamrnb_js_decoder_stat(h, 18) !== 0,
      outputFrames: m._vamrnb_js_decoder_stat(h, 19),
    };
  }

  #take() {
    const m = this.m;
    const h = this.live;
    const n = m._vamrnb_js_decoder_output_samples(h);
    const ptr = m._vamrnb_js_decoder_output(h);
    const out = new Int16Array(n);
    if (n) out.set(m.HEAP16.subarray(ptr >> 1, (ptr >> 1) + n));
    m._vamrnb_js_decoder_consume(h);
    return out;
  }
}

// Encodes 8 kHz samples given in chunks of any size into a storage-format
// stream; the first bytes returned are the "#!AMR\n" header.
export class Encoder extends Handle {
  constructor({ mode = 'MR122', dtx = false, vad = 1 } = {}) {
    const m = module();
    if (vad !== 1 && vad !== 2) throw new RangeError('vamrnb: vad must be 1 or 2');
    const err = m._vamrnb_js_alloc(4);
    let h;
    try {
      m.HEAP32[err >> 2] = 0;
      h = m._vamrnb_js_encoder_create(modeIndex(mode), dtx ? 1 : 0, vad === 2 ? 1 : 0, err);
      if (!h) check(m.HEAP32[err >> 2] || -2, m);
    } finally {
      m._vamrnb_js_free(err);
    }
    super(m, h, '_vamrnb_js_encoder_delete');
  }

  // Mode of the frames encoded from the next push on.
  set mode(mode) {
    check(this.m._vamrnb_js_encoder_set_mode(this.live, modeIndex(mode)), this.m);
  }

  // Returns the bytes of every frame completed by these samples.
  push(samples) {
    const m = this.m;
    const h = this.live;
    const pcm = toInt16(samples);
    const bytes = new Uint8Array(pcm.buffer, pcm.byteOffset, pcm.byteLength);
    check(withHeapCopy(m, bytes, (p) => m._vamrnb_js_encoder_push(h, p, pcm.length)), m);
    return this.#take();
  }

  // Codes a last partial frame, completed with silence; returns its bytes.
  end() {
    check(this.m._vamrnb_js_encoder_finish(this.live), this.m);
    return this.#take();
  }

  // Frames written so far, per frame type (0..7 speech, 8 SID, 15 no data).
  get stats() {
    return { byType: Array.from({ length: 16 }, (_, i) => this.m._vamrnb_js_encoder_stat(this.live, i)) };
  }

  #take() {
    const m = this.m;
    const h = this.live;
    const n = m._vamrnb_js_encoder_output_bytes(h);
    const ptr = m._vamrnb_js_encoder_output(h);
    const out = m.HEAPU8.slice(ptr, ptr + n);
    m._vamrnb_js_encoder_consume(h);
    return out;
  }
}

// Decodes a whole .amr file (with or without its header) to 8 kHz samples.
export async function decode(amrBytes) {
  await ready();
  const dec = new Decoder();
  try {
    const a = dec.push(amrBytes);
    const b = dec.end();
    const out = new Int16Array(a.length + b.length);
    out.set(a);
    out.set(b, a.length);
    return out;
  } finally {
    dec.free();
  }
}

// Resamples to 8 kHz with the Web Audio API (browsers and workers).
async function resample(samples, sampleRate) {
  if (typeof OfflineAudioContext !== 'function') {
    throw new Error(`vamrnb: resampling from ${sampleRate} Hz needs the Web Audio API's ` +
      'OfflineAudioContext; pass 8000 Hz samples here');
  }
  const float = samples instanceof Float32Array ? samples
    : Float32Array.from(toInt16(samples), (v) => v / 32768);
  const length = Math.ceil((float.length * SAMPLE_RATE) / sampleRate);
  const ctx = new OfflineAudioContext(1, Math.max(length, 1), SAMPLE_RATE);
  const buffer = ctx.createBuffer(1, float.length, sampleRate);
  buffer.copyToChannel(float, 0);
  const source = ctx.createBufferSource();
  source.buffer = buffer;
  source.connect(ctx.destination);
  source.start();
  return (await ctx.startRendering()).getChannelData(0).subarray(0, length);
}

// Encodes a whole recording to a .amr file.  Samples at another rate than
// 8000 Hz are resampled first; a last partial frame is completed with silence.
export async function encode(samples, { mode = 'MR122', dtx = false, vad = 1, sampleRate = SAMPLE_RATE } = {}) {
  await ready();
  if (!(samples instanceof Int16Array || samples instanceof Float32Array)) toInt16(samples);  // throws
  const input = sampleRate === SAMPLE_RATE ? samples : await resample(samples, sampleRate);
  const enc = new Encoder({ mode, dtx, vad });
  try {
    const a = enc.push(input);
    const b = enc.end();
    const out = new Uint8Array(a.length + b.length);
    out.set(a);
    out.set(b, a.length);
    return out;
  } finally {
    enc.free();
  }
}

// Bytes of the module's heap in use: a diagnostic for leak checks.
export function heapInUse() {
  return module()._vamrnb_js_heap_in_use();
}

export { FRAME_SAMPLES, SAMPLE_RATE };
