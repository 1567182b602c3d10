// The demo page: decodes a dropped .amr file (waveform, frame statistics,
// playback) and encodes the microphone or the bundled WAV to a download.
// window.vamrnbDemo exposes the results and a timing run to the browser test.
import { ready, Decoder, encode, decode, MODES, FRAME_TYPES, SAMPLE_RATE } from '../src/index.js';

const $ = (id) => document.getElementById(id);
const demo = { lastDecoded: null, lastStats: null, lastEncoded: null };
window.vamrnbDemo = demo;

for (const [i, m] of MODES.entries()) $('mode').add(new Option(m, i, i === 7, i === 7));

// Audio files of any kind (WAV, the recorder's format) to 8 kHz mono samples,
// with the browser's own decoder and resampler.
async function toCodecRate(arrayBuffer) {
  const ctx = new OfflineAudioContext(1, 1, SAMPLE_RATE);
  return (await ctx.decodeAudioData(arrayBuffer)).getChannelData(0);
}

function drawWaveform(pcm) {
  const canvas = $('waveform');
  const g = canvas.getContext('2d');
  const { width, height } = canvas;
  g.clearRect(0, 0, width, height);
  g.fillStyle = '#2a5db0';
  const step = Math.max(1, Math.floor(pcm.length / width));
  for (let x = 0; x < width && x * step < pcm.length; x++) {
    let lo = 0;
    let hi = 0;
    for (let i = x * step; i < Math.min(pcm.length, (x + 1) * step); i++) {
      lo = Math.min(lo, pcm[i]);
      hi = Math.max(hi, pcm[i]);
    }
    const y0 = height / 2 - (hi / 32768) * (height / 2);
    const y1 = height / 2 - (lo / 32768) * (height / 2);
    g.fillRect(x, y0, 1, Math.max(1, y1 - y0));
  }
}

const speed = (seconds, ms) => `${(seconds / (ms / 1000)).toFixed(0)}× real time`;

async function showAmr(name, bytes) {
  $('decode-error').textContent = '';
  const dec = new Decoder();
  try {
    const t0 = performance.now();
    const parts = [dec.push(bytes), dec.end()];
    const ms = performance.now() - t0;
    const pcm = new Int16Array(parts[0].length + parts[1].length);
    pcm.set(parts[0]);
    pcm.set(parts[1], parts[0].length);
    const stats = dec.stats;
    Object.assign(demo, { lastDecoded: pcm, lastStats: stats });
    const seconds = pcm.length / SAMPLE_RATE;
    $('file-name').textContent = name;
    $('duration').textContent = seconds.toFixed(2);
    $('frames').textContent = String(stats.frames);
    $('speed').textContent = `decoded in ${ms.toFixed(1)} ms, ${speed(seconds, ms)}`;
    const rows = FRAME_TYPES.map((type, i) => [type, stats.byType[i]]).filter(([, n]) => n > 0)
      .map(([type, n]) => `<tr><td>${type}</td><td>${n}</td></tr>`);
    rows.push(`<tr><th>all</th><th>${stats.frames}</th></tr>`);
    $('stats').tBodies[0].innerHTML = rows.join('');
    $('bad').textContent = `${stats.bad} bad frames (Q = 0) concealed, ${stats.refused} refused` +
      (stats.truncated ? ', last frame cut off and concealed' : '');
    drawWaveform(pcm);
    $('decoded').hidden = false;
    document.body.dataset.decoded = name;
  } catch (e) {
    $('decode-error').textContent = e.message;
    $('decoded').hidden = true;
    document.body.dataset.decoded = `error: ${e.message}`;
  } finally {
    dec.free();
  }
}

$('play').onclick = () => {
  const pcm = demo.lastDecoded;
  const ctx = new AudioContext();
  const buffer = ctx.createBuffer(1, pcm.length, SAMPLE_RATE);
  buffer.copyToChannel(Float32Array.from(pcm, (v) => v / 32768), 0);
  const source = ctx.createBufferSource();
  source.buffer = buffer;
  source.connect(ctx.destination);
  source.start();
};

const openFile = async (file) => showAmr(file.name, new Uint8Array(await file.arrayBuffer()));
$('amr-file').onchange = (e) => e.target.files[0] && openFile(e.target.files[0]);
$('drop').ondragover = (e) => { e.preventDefault(); $('drop').classList.add('over'); };
$('drop').ondragleave = () => $('drop').classList.remove('over');
$('drop').ondrop = (e) => {
  e.preventDefault();
  $('drop').classList.remove('over');
  if (e.dataTransfer.files[0]) openFile(e.dataTransfer.files[0]);
};

async function encodeAndOffer(samples) {
  $('encode-error').textContent = '';
  const options = { mode: Number($('mode').value), dtx: $('dtx').checked, vad: Number($('vad').value) };
  const t0 = performance.now();
  const amr = await encode(samples, options);
  const ms = performance.now() - t0;
  demo.lastEncoded = amr;
  const seconds = samples.length / SAMPLE_RATE;
  $('encoded-seconds').textContent = seconds.toFixed(2);
  $('encoded-bytes').textContent = String(amr.length);
  $('encode-speed').textContent = speed(seconds, ms);
  const link = $('download');
  if (link.href) URL.revokeObjectURL(link.href);
  link.href = URL.createObjectURL(new Blob([amr], { type: 'audio/amr' }));
  $('encoded').hidden = false;
  document.body.dataset.encoded = String(amr.length);
}

const failEncode = (e) => { $('encode-error').textContent = e.message; };

$('encode-sample').onclick = async () => {
  try {
    const wav = await (await fetch('sample.wav')).arrayBuffer();
    await encodeAndOffer(await toCodecRate(wav));
  } catch (e) { failEncode(e); }
};

let recorder = null;
$('record').onclick = async () => {
  if (recorder) {
    recorder.stop();
    return;
  }
  try {
    const stream = await navigator.mediaDevices.getUserMedia({ audio: true });
    const chunks = [];
    recorder = new MediaRecorder(stream);
    recorder.ondataavailable = (e) => chunks.push(e.data);
    recorder.onstop = async () => {
      stream.getTracks().forEach((t) => t.stop());
      recorder = null;
      $('record').textContent = 'Record from the microphone';
      try {
        await encodeAndOffer(await toCodecRate(await new Blob(chunks).arrayBuffer()));
      } catch (e) { failEncode(e); }
    };
    recorder.start();
    $('record').textContent = 'Stop recording';
  } catch (e) { failEncode(e); }
};

// Timing for the browser test: decode and encode of 8 kHz samples fetched
// from url, best of a few runs; real-time factors.
demo.bench = async (url, runs = 5) => {
  const raw = new Uint8Array(await (await fetch(url)).arrayBuffer());
  const pcm = new Int16Array(raw.buffer, 0, raw.length >> 1);
  const seconds = pcm.length / SAMPLE_RATE;
  let enc = Infinity;
  let dec = Infinity;
  let amr;
  for (let i = 0; i < runs; i++) {
    let t0 = performance.now();
    amr = await encode(pcm, { mode: 'MR122' });
    enc = Math.min(enc, performance.now() - t0);
    t0 = performance.now();
    await decode(amr);
    dec = Math.min(dec, performance.now() - t0);
  }
  return { seconds, encodeRtf: seconds / (enc / 1000), decodeRtf: seconds / (dec / 1000) };
};

ready().then(() => {
  $('status').textContent = 'Codec ready: drop a file or record.';
  document.body.dataset.ready = '1';
}, (e) => {
  $('status').textContent = `The codec did not load: ${e.message}`;
  $('status').className = 'error';
});
