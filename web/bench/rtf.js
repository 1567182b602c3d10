// Real-time factors of the WebAssembly build under node: seconds of speech
// per second of processing, best of a few runs, for encoding and decoding
// the installation test sequence (8.5 s) in the lowest and highest mode.
//   npm run bench [-- runs]
import { readFileSync, statSync } from 'node:fs';
import { ready, encode, decode } from '../src/index.js';

const runs = Number(process.argv[2] ?? 10);
const raw = readFileSync(new URL('../../tests/data/vectors/3gpp/spch_dos_input.pcm', import.meta.url));
const pcm = new Int16Array(raw.buffer, raw.byteOffset, raw.length >> 1);
const seconds = pcm.length / 8000;
await ready();

const best = async (fn) => {
  let ms = Infinity;
  for (let i = 0; i < runs; i++) {
    const t0 = performance.now();
    await fn();
    ms = Math.min(ms, performance.now() - t0);
  }
  return seconds / (ms / 1000);
};

const wasm = statSync(new URL('../dist/vamrnb_wasm.wasm', import.meta.url)).size;
console.log(`node ${process.version}, vamrnb_wasm.wasm ${wasm} bytes, ${seconds} s of speech, best of ${runs}`);
for (const options of [{ mode: 'MR122' }, { mode: 'MR475' }, { mode: 'MR122', dtx: true }]) {
  const amr = await encode(pcm, options);
  const enc = await best(() => encode(pcm, options));
  const dec = await best(() => decode(amr));
  const label = `${options.mode}${options.dtx ? ' DTX' : ''}`.padEnd(10);
  console.log(`${label} encode ${enc.toFixed(0).padStart(5)}x   decode ${dec.toFixed(0).padStart(5)}x real time`);
}
