// The demo's local server: node's http module serving the package directory
// (the page under /demo/, the module under /src/ and /dist/) and, for the
// browser test, the bundled test data under /data/.  Only on 127.0.0.1.
//   node demo/serve.js [port]      then open http://127.0.0.1:<port>/demo/
import http from 'node:http';
import { readFile } from 'node:fs/promises';
import path from 'node:path';
import { fileURLToPath } from 'node:url';

const WEB = fileURLToPath(new URL('..', import.meta.url));
const DATA = fileURLToPath(new URL('../../tests/data/', import.meta.url));
const TYPES = {
  '.html': 'text/html; charset=utf-8', '.js': 'text/javascript', '.css': 'text/css',
  '.wasm': 'application/wasm', '.wav': 'audio/wav', '.amr': 'audio/amr',
};

// Maps a URL path onto a file below one of the two roots, or null.
function resolve(urlPath) {
  const decoded = decodeURIComponent(urlPath);
  const [root, rest] = decoded.startsWith('/data/') ? [DATA, decoded.slice(6)] : [WEB, decoded];
  const file = path.join(root, rest.endsWith('/') ? `${rest}index.html` : rest);
  return file.startsWith(root) && !file.includes(`${path.sep}node_modules${path.sep}`) ? file : null;
}

export function start(port = 0) {
  const server = http.createServer(async (req, res) => {
    const file = resolve(new URL(req.url, 'http://localhost').pathname);
    try {
      if (!file || req.method !== 'GET') throw new Error('refused');
      const body = await readFile(file);
      res.writeHead(200, { 'content-type': TYPES[path.extname(file)] ?? 'application/octet-stream' });
      res.end(body);
    } catch {
      res.writeHead(404, { 'content-type': 'text/plain' });
      res.end('not found\n');
    }
  });
  return new Promise((done) => server.listen(port, '127.0.0.1', () => done(server)));
}

if (process.argv[1] === fileURLToPath(import.meta.url)) {
  const server = await start(Number(process.argv[2] ?? 8080));
  console.log(`vamrnb demo: http://127.0.0.1:${server.address().port}/demo/`);
}
