// Devices made by the real orva-webapi and served over HTTPS on loopback,
// for the tests that point real TLS clients at them. Each lives in its own
// folder, removed with the server when the test ends.

import { execFile, spawn } from 'node:child_process';
import { once } from 'node:events';
import { mkdtemp, readFile, rm } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';
import { createInterface } from 'node:readline';
import { promisify } from 'node:util';

export const run = promisify(execFile);
const HOST = process.env.ORVA_WEBAPI;
export const SSL = 'usr/orva/etc/ssl';

// Runs `orva-webapi call` on `root`; rejects unless the device answers success.
export async function call(root, api, method, params = {}, extra = []) {
  const words = Object.entries(params).map(([name, value]) => `${name}=${value}`);
  const { stdout } = await run(HOST, ['call', '--root', root, api, method, ...words, ...extra]);
  return JSON.parse(stdout).data;
}

// A device for test `t` in a fresh folder (removed after it), whose local
// CA and server certificate CRT create made for `commonName`, with `alias`
// and, when `email` is set, an e-mail address for both, and the key
// parameters `keys` (RSA 2048 when empty). Resolves with { root, folder }.
export async function createDevice(t, { commonName, alias = '', email = false, keys = {} }) {
  const folder = await mkdtemp(path.join(os.tmpdir(), 'orva-clients-'));
  t.after(() => rm(folder, { recursive: true, force: true }));
  const root = path.join(folder, 'device');
  await run(HOST, ['init', '--root', root]);
  const subject = (prefix, name) => Object.fromEntries(['country', 'state', 'city',
    'organization', 'department', 'common_name', 'email'].map((field) => [prefix + field,
    { country: 'DE', organization: 'Device Maker', common_name: name,
      email: email ? 'admin@device.example' : '' }[field] ?? '']));
  await call(root, 'ORVA.Core.Certificate.CRT', 'create',
    { ...subject('ca_', 'Device Test CA'), ...subject('', commonName), alias, ...keys });
  return { root, folder };
}

// Signs a request for `subject` with names `sans` (openssl -addext text, or
// '') by the device's local CA, and imports the signed certificate with the
// request's key. Returns the signed certificate's file.
export async function signAndImport(root, folder, subject, sans, days = 825) {
  const file = (name) => path.join(folder, name);
  await run('openssl', ['req', '-new', '-newkey', 'rsa:2048', '-nodes', '-keyout',
    file('signed.key'), '-subj', subject, ...(sans ? ['-addext', sans] : []),
    '-out', file('signed.csr')]);
  await call(root, 'ORVA.Core.Certificate.CSR', 'sign', { days, csr: 'signed.csr' },
    ['--upload', `csr=${file('signed.csr')}`]);
  await call(root, 'ORVA.Core.Certificate', 'export', { file: 'signed_set' },
    ['--output', file('signed.zip')]);
  await run('7z', ['x', '-y', `-o${file('signed')}`, file('signed.zip')]);
  const certificate = file('signed/server.crt');
  await call(root, 'ORVA.Core.Certificate', 'import', {},
    ['--upload', `cert=${certificate}`, '--upload', `key=${file('signed.key')}`]);
  return certificate;
}

// Serves `root` with HTTPS on for test `t`. Resolves with the HTTPS port.
export async function serveHttps(t, root) {
  await run('sed', ['-i', 's/runHTTPS="no"/runHTTPS="yes"/', path.join(root, 'usr/orva/etc/orva.conf')]);
  const server = spawn(HOST, ['serve', '--root', root, '--listen', '127.0.0.1:0',
    '--listen-https', '127.0.0.1:0'], { stdio: ['ignore', 'pipe', 'inherit'] });
  t.after(async () => {
    if (server.exitCode !== null || server.signalCode !== null) return;
    server.kill('SIGTERM');
    await once(server, 'exit');
  });
  for await (const line of createInterface({ input: server.stdout })) {
    const port = /^https: +https:\/\/[^/]+:(\d+)\//.exec(line)?.[1];
    if (port) return Number(port);
    if (line.startsWith('https:')) throw new Error(`HTTPS is not up: ${line}`);
  }
  throw new Error('orva-webapi serve ended before it listened');
}

export const caFile = (root) => path.join(root, SSL, 'ssl.crt/ca.crt');
export const serverFile = (root) => path.join(root, SSL, 'ssl.crt/server.crt');
export const token = async (root) =>
  (await readFile(path.join(root, 'usr/orva/etc/webapi.token'), 'utf8')).trim();
