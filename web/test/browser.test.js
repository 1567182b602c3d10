// The demo page in headless Chromium (Debian's, driven by playwright-core):
// it loads, decodes a bundled .amr with the right duration and frame counts,
// and encodes the bundled WAV to exactly the reference stream.  Prints the
// real-time factors in the browser; leaves a screenshot in build/web/.
import { test } from 'node:test';
import assert from 'node:assert/strict';
import { existsSync, mkdirSync } from 'node:fs';
import path from 'node:path';
import { fileURLToPath } from 'node:url';
import { ready, Decoder } from '../src/index.js';
import { start } from '../demo/serve.js';
import { DATA, read, readCrcs } from './vectors.js';

const CHROMIUM = process.env.CHROMIUM ?? '/usr/bin/chromium';
const SHOT_DIR = fileURLToPath(new URL('../../build/web/', import.meta.url));

async function loadPlaywright() {
  try {
    return (await import('playwright-core')).chromium;
  } catch {
    return null;
  }
}

test('demo page decodes and encodes in headless Chromium', async (t) => {
  const chromium = await loadPlaywright();
  if (!chromium || !existsSync(CHROMIUM)) {
    t.skip(`needs playwright-core (npm ci) and ${CHROMIUM}`);
    return;
  }
  const server = await start();
  const browser = await chromium.launch({ executablePath: CHROMIUM, headless: true, args: ['--no-sandbox'] });
  try {
    const page = await browser.newPage();
    const errors = [];
    page.on('pageerror', (e) => errors.push(e.message));
    await page.goto(`http://127.0.0.1:${server.address().port}/demo/`);
    await page.waitForSelector('body[data-ready="1"]', { timeout: 20000 });

    // Decode: the installation stream, SID and no-data frames included.
    const amrPath = path.join(DATA, 'vectors/3gpp/spch_dos.amr');
    await page.setInputFiles('#amr-file', amrPath);
    await page.waitForSelector('body[data-decoded]');
    assert.equal(await page.getAttribute('body', 'data-decoded'), 'spch_dos.amr');
    const frames = readCrcs(path.join(DATA, 'vectors/3gpp/spch_dos.crc')).length;
    assert.equal(await page.textContent('#duration'), (frames * 0.02).toFixed(2));
    await ready();
    const dec = new Decoder();
    dec.push(read(amrPath));
    dec.end();
    const expected = dec.stats;
    dec.free();
    assert.deepEqual(await page.evaluate(() => window.vamrnbDemo.lastStats), expected);
    assert.equal(Number(await page.textContent('#frames')), expected.frames);

    // Encode the bundled WAV (the DTMF item of the corpus) in MR122 without DTX.
    await page.click('#encode-sample');
    await page.waitForSelector('body[data-encoded]');
    const encoded = Uint8Array.from(await page.evaluate(() => Array.from(window.vamrnbDemo.lastEncoded)));
    const reference = read(path.join(DATA, 'vectors/enc/sig_dtmf_1-9_0_star_hash_ABCD_100ms/MR122_nodtx.amr'));
    assert.deepEqual(encoded, reference);

    // 1 s at 48 kHz goes through the browser's resampler to 50 frames.
    const resampled = await page.evaluate(async () => {
      const { encode, decode } = await import('/src/index.js');
      const tone = Float32Array.from({ length: 48000 }, (_, i) => 0.5 * Math.sin((2 * Math.PI * 440 * i) / 48000));
      return (await decode(await encode(tone, { sampleRate: 48000 }))).length;
    });
    assert.equal(resampled, 8000);

    mkdirSync(SHOT_DIR, { recursive: true });
    await page.screenshot({ path: path.join(SHOT_DIR, 'demo.png'), fullPage: true });

    const rtf = await page.evaluate(() => window.vamrnbDemo.bench('/data/vectors/3gpp/spch_dos_input.pcm'));
    console.log(`browser: ${rtf.seconds} s of speech, MR122 encode ${rtf.encodeRtf.toFixed(0)}x, ` +
      `decode ${rtf.decodeRtf.toFixed(0)}x real time`);
    assert.deepEqual(errors, []);
  } finally {
    await browser.close();
    server.close();
  }
});
