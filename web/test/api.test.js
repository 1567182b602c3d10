// The package's contract beyond conformance: the errors it documents for
// input that is not AMR-NB, concealment of a cut-off stream, argument checks,
// and no heap growth over many calls.
import { test } from 'node:test';
import assert from 'node:assert/strict';
import { ready, decode, encode, Decoder, Encoder, heapInUse } from '../src/index.js';
import { decoderStreams, read } from './vectors.js';

await ready();
const bytes = (s) => new TextEncoder().encode(s);
const amr = read(decoderStreams().find((s) => s.name.includes('MR122_nodtx')).amr);

test('input that is not AMR-NB is refused with a message', async () => {
  const cases = [
    [new Uint8Array(0), /not an AMR-NB/],
    [bytes('#!AMR-WB\n\x04'), /AMR-WB|wideband/i],
    [bytes('#!AMR_MC1.0\n'), /multi-channel/],
    [bytes('#!AM'), /not an AMR-NB/],
    [bytes('RIFF\x24\x00\x00\x00WAVEfmt '), /not an AMR-NB/],
    [bytes('<!doctype html>'), /not an AMR-NB/],
    [Uint8Array.of(...bytes('#!AMR\n'), 0x80 | (7 << 3) | 4), /F bit|table-of-contents/i],
  ];
  for (const [input, message] of cases) {
    await assert.rejects(decode(input), (e) => e instanceof Error && message.test(e.message) &&
      e.status < 0, `input ${JSON.stringify(new TextDecoder().decode(input))}`);
  }
  await assert.rejects(decode('#!AMR\n'), TypeError);
});

test('a stream cut inside its last frame conceals that frame', async () => {
  const whole = await decode(amr);
  const cut = amr.subarray(0, amr.length - 5);
  const dec = new Decoder();
  const pcm = Int16Array.from([...dec.push(cut), ...dec.end()]);
  assert.equal(dec.stats.truncated, true);
  dec.free();
  assert.equal(pcm.length, whole.length);
  assert.deepEqual(pcm.subarray(0, whole.length - 160), whole.subarray(0, whole.length - 160));
  // The magic alone is an empty stream, not an error.
  assert.equal((await decode(bytes('#!AMR\n'))).length, 0);
});

test('bad arguments throw before any work', async () => {
  assert.throws(() => new Encoder({ mode: 'MR99' }), RangeError);
  assert.throws(() => new Encoder({ mode: 8 }), RangeError);
  assert.throws(() => new Encoder({ vad: 3 }), RangeError);
  await assert.rejects(encode([1, 2, 3]), TypeError);
  await assert.rejects(encode(new Int16Array(160), { sampleRate: 48000 }), /OfflineAudioContext/);
  const enc = new Encoder();
  enc.free();
  enc.free();  // a second free is harmless
  assert.throws(() => enc.push(new Int16Array(160)), /after free/);
});

test('many calls leave the heap as they found it', async () => {
  const pcm = (await decode(amr)).subarray(0, 8000);
  await encode(pcm, { dtx: true });  // first calls may grow the allocator's pools
  const before = heapInUse();
  for (let i = 0; i < 48; i++) {
    await decode(amr);
    await encode(pcm, { mode: i % 8, dtx: i % 2 === 0, vad: 1 + (i % 3 === 0) });
    await assert.rejects(decode(bytes('not amr at all')));
    new Decoder().free();
  }
  assert.equal(heapInUse(), before);
});
