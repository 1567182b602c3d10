// The bundled conformance subset (tests/data) as the node tests read it:
// decoder streams with their per-frame CRCs, encoder inputs with their
// expected streams.
import { readFileSync, readdirSync, existsSync } from 'node:fs';
import { fileURLToPath } from 'node:url';
import path from 'node:path';

export const DATA = fileURLToPath(new URL('../../tests/data/', import.meta.url));
const VECTORS = path.join(DATA, 'vectors');

export const read = (file) => new Uint8Array(readFileSync(file));

export function readPcm(file) {
  const b = read(file);
  return new Int16Array(b.buffer, b.byteOffset, b.byteLength >> 1);
}

export function readCrcs(file) {
  const b = read(file);
  return new Uint32Array(b.slice().buffer);  // little-endian, as stored
}

const TABLE = Uint32Array.from({ length: 256 }, (_, n) => {
  let c = n;
  for (let k = 0; k < 8; k++) c = c & 1 ? 0xedb88320 ^ (c >>> 1) : c >>> 1;
  return c >>> 0;
});

// CRC-32 (zlib) of one 160-sample frame as little-endian bytes.
export function frameCrc(samples, frame) {
  const bytes = new Uint8Array(samples.buffer, samples.byteOffset + frame * 320, 320);
  let c = 0xffffffff;
  for (const b of bytes) c = TABLE[(c ^ b) & 0xff] ^ (c >>> 8);
  return (c ^ 0xffffffff) >>> 0;
}

const dirs = (d) => readdirSync(d, { withFileTypes: true }).filter((e) => e.isDirectory())
  .map((e) => e.name).sort();
const files = (d, ext) => readdirSync(d).filter((f) => f.endsWith(ext)).sort();

// Every stream with reference decoder output: { name, amr, crc }.
export function decoderStreams() {
  const out = [];
  for (const item of dirs(path.join(VECTORS, 'dec'))) {
    for (const crc of files(path.join(VECTORS, 'dec', item), '.crc')) {
      const stem = crc.slice(0, -4);
      out.push({ name: `dec/${item}/${stem}`, amr: path.join(VECTORS, 'enc', item, `${stem}.amr`),
        crc: path.join(VECTORS, 'dec', item, crc) });
    }
  }
  for (const item of dirs(path.join(VECTORS, 'err'))) {
    for (const amr of files(path.join(VECTORS, 'err', item), '.amr')) {
      const base = path.join(VECTORS, 'err', item, amr.slice(0, -4));
      out.push({ name: `err/${item}/${amr.slice(0, -4)}`, amr: `${base}.amr`, crc: `${base}.crc` });
    }
  }
  for (const name of ['spch_dos', 'spch_do2']) {
    const base = path.join(VECTORS, '3gpp', name);
    if (existsSync(`${base}.amr`)) out.push({ name: `3gpp/${name}`, amr: `${base}.amr`, crc: `${base}.crc` });
  }
  return out;
}

const CFG = { nodtx: { dtx: false, vad: 1 }, vad1: { dtx: true, vad: 1 }, vad2: { dtx: true, vad: 2 } };

// Every encoder run: { name, pcm, amr, mode, dtx, vad, modes? }.
export function encoderRuns() {
  const out = [];
  for (const item of dirs(path.join(VECTORS, 'enc'))) {
    for (const amr of files(path.join(VECTORS, 'enc', item), '.amr')) {
      const [mode, cfg] = amr.slice(0, -4).split('_');
      out.push({ name: `enc/${item}/${mode}_${cfg}`, pcm: path.join(DATA, 'corpus', `${item}.pcm`),
        amr: path.join(VECTORS, 'enc', item, amr), mode, ...CFG[cfg] });
    }
  }
  const dir = path.join(VECTORS, '3gpp');
  if (existsSync(path.join(dir, 'modes.txt'))) {
    const modes = readFileSync(path.join(dir, 'modes.txt'), 'utf8').split('\n').map((l) => l.trim())
      .filter(Boolean);
    for (const [name, vad] of [['spch_dos', 1], ['spch_do2', 2]]) {
      out.push({ name: `3gpp/${name}`, pcm: path.join(dir, 'spch_dos_input.pcm'),
        amr: path.join(dir, `${name}.amr`), mode: modes[0], modes, dtx: true, vad });
    }
  }
  return out;
}
