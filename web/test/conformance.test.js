// The WebAssembly build against the reference: decoder output frame for frame
// by CRC, encoder streams byte for byte (every mode, DTX off and with both
// detectors, and the installation vectors that switch mode every frame).
import { test } from 'node:test';
import assert from 'node:assert/strict';
import { ready, decode, encode, Decoder, Encoder } from '../src/index.js';
import { decoderStreams, encoderRuns, frameCrc, read, readCrcs, readPcm } from './vectors.js';

await ready();

test('decoder output equals the reference CRCs frame for frame', async () => {
  let exact = 0;
  let total = 0;
  const streams = decoderStreams();
  assert.ok(streams.length >= 50, `only ${streams.length} streams found`);
  for (const s of streams) {
    const pcm = await decode(read(s.amr));
    const crcs = readCrcs(s.crc);
    assert.equal(pcm.length, crcs.length * 160, `${s.name}: output frame count`);
    let first = -1;
    for (let f = 0; f < crcs.length; f++) {
      if (frameCrc(pcm, f) === crcs[f]) exact++;
      else if (first < 0) first = f;
    }
    total += crcs.length;
    assert.equal(first, -1, `${s.name}: first differing frame ${first}`);
  }
  console.log(`decoder: ${exact}/${total} frames exact in ${streams.length} streams`);
});

test('chunked and headerless input decode to the same samples', async () => {
  const s = decoderStreams().find((x) => x.name.includes('vad1_MR795_ft9-14'));
  const amr = read(s.amr);
  const whole = await decode(amr);
  assert.deepEqual(await decode(amr.subarray(6)), whole);  // without "#!AMR\n"
  const dec = new Decoder();
  const parts = [];
  for (let i = 0; i < amr.length; i += 7) parts.push(dec.push(amr.subarray(i, i + 7)));
  parts.push(dec.end());
  const stats = dec.stats;
  dec.free();
  assert.deepEqual(Int16Array.from(parts.flatMap((p) => [...p])), whole);
  // Types 10 and 11 are refused and leave no output; every other frame gives 160 samples.
  assert.equal(stats.outputFrames, stats.frames - stats.refused);
  assert.ok(stats.refused > 0 && stats.byType[9] > 0 && stats.byType[14] > 0);
});

test('encoder streams equal the reference byte for byte', () => {
  const runs = encoderRuns();
  assert.ok(runs.length >= 50, `only ${runs.length} runs found`);
  let frames = 0;
  for (const r of runs) {
    const pcm = readPcm(r.pcm);
    const expected = read(r.amr);
    const enc = new Encoder({ mode: r.mode, dtx: r.dtx, vad: r.vad });
    const parts = [];
    const whole = Math.floor(pcm.length / 160);  // the reference leaves a partial frame out
    for (let f = 0; f < whole; f++) {
      if (r.modes) enc.mode = r.modes[f];
      parts.push(enc.push(pcm.subarray(f * 160, f * 160 + 160)));
    }
    enc.free();
    const ours = Buffer.concat(parts);
    assert.ok(ours.equals(Buffer.from(expected)), `${r.name}: stream differs at byte ${
      ours.findIndex((b, i) => b !== expected[i])} (${ours.length} vs ${expected.length} bytes)`);
    frames += whole;
  }
  console.log(`encoder: ${frames} frames in ${runs.length} streams byte for byte`);
});

test('encode() pads a last partial frame and takes Float32 samples', async () => {
  const r = encoderRuns().find((x) => x.name.endsWith('odd-length/MR475_vad2'));
  const pcm = readPcm(r.pcm);
  const expected = read(r.amr);
  assert.notEqual(pcm.length % 160, 0);
  const ours = await encode(pcm, { mode: r.mode, dtx: r.dtx, vad: r.vad });
  // The reference stream, then one more frame for the padded remainder.
  assert.deepEqual(ours.subarray(0, expected.length), expected);
  assert.ok(ours.length > expected.length && ours.length <= expected.length + 32);
  const float = Float32Array.from(pcm, (v) => (v < 0 ? v / 32768 : v / 32767));
  assert.deepEqual(await encode(float, { mode: r.mode, dtx: r.dtx, vad: r.vad }), ours);
});
