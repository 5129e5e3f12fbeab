// One device per test: a fresh device root served by the real orva-webapi on
// loopback, and headless Debian Chromium showing its page. Everything goes
// away when the test ends, the browser before the server it talks to.

import { execFile, spawn } from 'node:child_process';
import { once } from 'node:events';
import { mkdtemp, readFile, rm } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';
import { promisify } from 'node:util';

import { chromium } from 'playwright-core';

export const run = promisify(execFile);
export const HOST_BINARY = process.env.ORVA_WEBAPI;

// Resolves with the address the server prints once it listens; rejects when
// the server ends first.
function servingUrl(server) {
  return new Promise((resolve, reject) => {
    let output = '';
    const collect = (chunk) => {
      output += chunk;
      const match = /^http: +(\S+)$/m.exec(output);
      if (match) resolve(match[1]);
    };
    server.stdout.on('data', collect);
    server.stderr.on('data', collect);
    server.once('exit', () => reject(new Error(`orva-webapi serve ended:\n${output}`)));
  });
}

// Resolves with { root, token, folder, page, consoleErrors } for test `t`,
// the page opened at the server's address. `prepare(root)` runs on the new
// device root before the server starts; with `https` the server listens for
// HTTPS too. `folder` is scratch space; `consoleErrors` collects what the
// page writes to the console as an error, and anything it throws.
export async function openDevice(t, { prepare, https = false } = {}) {
  const folder = await mkdtemp(path.join(os.tmpdir(), 'orva-web-test-'));
  let browser = null;
  let server = null;
  t.after(async () => {
    await browser?.close();
    if (server !== null && server.exitCode === null && server.signalCode === null) {
      server.kill('SIGTERM');
      await once(server, 'exit');
    }
    await rm(folder, { recursive: true, force: true });
  });

  const root = path.join(folder, 'device');
  await run(HOST_BINARY, ['init', '--root', root]);
  const token = (await readFile(path.join(root, 'usr/orva/etc/webapi.token'), 'utf8')).trim();
  if (prepare) await prepare(root);
  const args = ['serve', '--root', root, '--listen', '127.0.0.1:0', '--web', process.env.ORVA_WEB_DIR];
  if (https) args.push('--listen-https', '127.0.0.1:0');
  server = spawn(HOST_BINARY, args, { stdio: ['ignore', 'pipe', 'pipe'] });
  const url = await servingUrl(server);

  browser = await chromium.launch({ executablePath: '/usr/bin/chromium' });
  const page = await browser.newPage({ viewport: { width: 1280, height: 900 } });
  const consoleErrors = [];
  page.on('console', (message) => {
    if (message.type() === 'error') consoleErrors.push(message.text());
  });
  page.on('pageerror', (error) => consoleErrors.push(`uncaught: ${error.message}`));
  await page.goto(url);
  return { root, token, folder, page, consoleErrors };
}

// Saves a full-page screenshot as NAME.png in the screenshot folder, if any.
export async function screenshot(page, name) {
  if (!process.env.ORVA_SCREENSHOTS) return;
  await page.screenshot({ path: path.join(process.env.ORVA_SCREENSHOTS, `${name}.png`), fullPage: true });
}
