// Compiled (not run) by types.test.js: the declarations must describe the
// package as a TypeScript user calls it.
import { ready, decode, encode, Decoder, Encoder, MODES, type DecoderStats } from '../src/index.js';

export async function roundTrip(file: Uint8Array, mic: Float32Array): Promise<number> {
  await ready();
  const pcm: Int16Array = await decode(file);
  const amr: Uint8Array = await encode(mic, { mode: 'MR795', dtx: true, vad: 2, sampleRate: 48000 });
  const dec = new Decoder();
  const more: Int16Array = dec.push(amr);
  const stats: DecoderStats = dec.stats;
  dec.free();
  const enc = new Encoder({ mode: 3 });
  enc.mode = MODES[0];
  enc.push(pcm);
  enc.free();
  return more.length + stats.frames;
}
