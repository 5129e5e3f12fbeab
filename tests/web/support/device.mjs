// One device per test: a fresh device root served by the real orva-webapi on
// loopback, and headless Debian Chromium showing its page. Everything goes
// away when the test ends, the browser before the server it talks to.

import { execFile, spawn } from 'node:child_process';
import { once } from 'node:events';
import { mkdtemp, readFile, rm } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';
import { createInterface } from 'node:readline';
import { promisify } from 'node:util';

import { chromium } from 'playwright-core';

export const run = promisify(execFile);
export const HOST_BINARY = process.env.ORVA_WEBAPI;

// Resolves with { root, token, folder, page, consoleErrors } for test `t`,
// the page opened at the server's address. `prepare(root)` runs on the new
// device root before the server starts; with `https` the device runs HTTPS,
// so that a new certificate restarts its management web server. `folder` is
// scratch space; `consoleErrors` collects what the page writes to the console
// as an error, and anything it throws.
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
  const args = ['serve', '--root', root, '--listen', '127.0.0.1:0',
    '--web', process.env.ORVA_WEB_DIR];
  if (https) {
    const conf = path.join(root, 'usr/orva/etc/orva.conf');
    await run('sed', ['-i', 's/runHTTPS="no"/runHTTPS="yes"/', conf]);
    args.push('--listen-https', '127.0.0.1:0');
  }
  server = spawn(HOST_BINARY, args, { stdio: ['ignore', 'pipe', 'inherit'] });
  let url = null;
  for await (const line of createInterface({ input: server.stdout })) {
    url = /^http: +(\S+)$/.exec(line)?.[1];
    if (url) break;
  }
  if (!url) throw new Error('orva-webapi serve ended before it listened');

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
  const folder = process.env.ORVA_SCREENSHOTS;
  if (folder) await page.screenshot({ path: path.join(folder, `${name}.png`), fullPage: true });
}
