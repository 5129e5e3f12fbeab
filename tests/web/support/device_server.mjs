// Runs the real orva-webapi server on a free loopback port with a fresh
// device root, and stops it (and removes the root) when the test ends.

import { execFile, spawn } from 'node:child_process';
import { mkdtemp, readFile, rm } from 'node:fs/promises';
import net from 'node:net';
import os from 'node:os';
import path from 'node:path';
import { promisify } from 'node:util';

import { atTestEnd } from './cleanup.mjs';

const run = promisify(execFile);

export const HOST_BINARY = process.env.ORVA_WEBAPI;
export const WEB_DIR = process.env.ORVA_WEB_DIR;

const START_TIMEOUT_MS = 15_000;
const STOP_TIMEOUT_MS = 5_000;

function freePort() {
  return new Promise((resolve, reject) => {
    const probe = net.createServer();
    probe.once('error', reject);
    probe.listen(0, '127.0.0.1', () => {
      const { port } = probe.address();
      probe.close(() => resolve(port));
    });
  });
}

function exited(child) {
  return child.exitCode !== null || child.signalCode !== null;
}

function waitForExit(child, ms) {
  if (exited(child)) return Promise.resolve(true);
  return new Promise((resolve) => {
    const timer = setTimeout(() => resolve(false), ms);
    child.once('exit', () => {
      clearTimeout(timer);
      resolve(true);
    });
  });
}

async function waitUntilServing(url, child, log) {
  const deadline = Date.now() + START_TIMEOUT_MS;
  while (Date.now() < deadline) {
    if (exited(child)) throw new Error(`orva-webapi serve ended early:\n${log()}`);
    try {
      const response = await fetch(url);
      if (response.ok) return;
    } catch {
      // Not listening yet.
    }
    await new Promise((resolve) => { setTimeout(resolve, 100); });
  }
  throw new Error(`orva-webapi serve did not answer within ${START_TIMEOUT_MS} ms:\n${log()}`);
}

// Runs one method in-process on the device root, as the command line does.
// Resolves with the answer's JSON; rejects when the method fails.
export async function callMethod(root, api, method, params = {}) {
  const args = ['call', '--root', root, api, method,
    ...Object.entries(params).map(([name, value]) => `${name}=${value}`)];
  const { stdout } = await run(HOST_BINARY, args);
  return JSON.parse(stdout);
}

// Starts a server for test `t`; it is stopped, and its device root removed,
// when the test ends.
// `prepare(root)` runs after init and before the server starts; with `https`
// the server also gets a free port for its HTTPS listener.
// Resolves with { url, token, root, log() }.
export async function startDeviceServer(t, { prepare, https = false } = {}) {
  if (!HOST_BINARY || !WEB_DIR) throw new Error('ORVA_WEBAPI and ORVA_WEB_DIR must be set');
  const scratch = await mkdtemp(path.join(os.tmpdir(), 'orva-web-test-'));
  let child = null;
  atTestEnd(t, async () => {
    if (child !== null && !exited(child)) {
      child.kill('SIGTERM');
      if (!(await waitForExit(child, STOP_TIMEOUT_MS))) {
        child.kill('SIGKILL');
        await waitForExit(child, STOP_TIMEOUT_MS);
      }
    }
    await rm(scratch, { recursive: true, force: true });
  });

  const root = path.join(scratch, 'device');
  await run(HOST_BINARY, ['init', '--root', root]);
  const token = (await readFile(path.join(root, 'usr/orva/etc/webapi.token'), 'utf8')).trim();
  if (prepare) await prepare(root);

  const port = await freePort();
  const url = `http://127.0.0.1:${port}/`;
  let output = '';
  const args = ['serve', '--root', root, '--listen', `127.0.0.1:${port}`, '--web', WEB_DIR];
  if (https) args.push('--listen-https', `127.0.0.1:${await freePort()}`);
  child = spawn(HOST_BINARY, args, { stdio: ['ignore', 'pipe', 'pipe'] });
  child.stdout.on('data', (chunk) => { output += chunk; });
  child.stderr.on('data', (chunk) => { output += chunk; });
  const log = () => output;
  await waitUntilServing(url, child, log);
  return { url, token, root, log };
}
