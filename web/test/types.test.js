// The TypeScript declarations compile against a typical use (test/usage.ts).
import { test } from 'node:test';
import assert from 'node:assert/strict';
import { execFileSync } from 'node:child_process';
import { createRequire } from 'node:module';

test('declarations type-check a typical use', (t) => {
  let tsc;
  try {
    tsc = createRequire(import.meta.url).resolve('typescript/bin/tsc');
  } catch {
    t.skip('typescript not installed (npm ci)');
    return;
  }
  const dir = new URL('.', import.meta.url);
  assert.doesNotThrow(() => execFileSync(process.execPath, [tsc, '--noEmit', '--strict',
    '--target', 'es2022', '--module', 'nodenext', '--moduleResolution', 'nodenext', 'usage.ts'],
  { cwd: dir, stdio: 'pipe' }));
});
