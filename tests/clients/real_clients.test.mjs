// Real TLS clients against the device's own HTTPS, presenting certificates
// the device made: every client must accept every one by every name it was
// made for, and the device's own verdict (which tests/api/compatibility_test
// ties to each rule) names no client that would refuse one of them.

import assert from 'node:assert/strict';
import { X509Certificate } from 'node:crypto';
import { mkdir, readFile } from 'node:fs/promises';
import path from 'node:path';
import { test } from 'node:test';

import { chromium, newDevice, run, serve } from '../web/device.mjs';

const caFile = (root) => path.join(root, 'usr/orva/etc/ssl/ssl.crt/ca.crt');
const serverFile = (root) => path.join(root, 'usr/orva/etc/ssl/ssl.crt/server.crt');

// Runs `orva-webapi call` on `root`; rejects unless the device answers success.
async function call(root, api, method, params = {}, extra = []) {
  const words = Object.entries(params).map(([name, value]) => `${name}=${value}`);
  const { stdout } = await run(process.env.ORVA_WEBAPI,
    ['call', '--root', root, api, method, ...words, ...extra]);
  return JSON.parse(stdout).data;
}

// A device for test `t` whose local CA and server certificate CRT create
// made for `commonName`, with `alias` and, when `email` is set, an e-mail
// address for both, and the key parameters `keys` (RSA 2048 when empty).
async function createDevice(t, { commonName, alias = '', email = false, keys = {} }) {
  const device = await newDevice(t);
  const subject = (prefix, name) => Object.fromEntries(['country', 'state', 'city',
    'organization', 'department', 'common_name', 'email'].map((field) => [prefix + field,
    { country: 'DE', organization: 'Device Maker', common_name: name,
      email: email ? 'admin@device.example' : '' }[field] ?? '']));
  await call(device.root, 'ORVA.Core.Certificate.CRT', 'create',
    { ...subject('ca_', 'Device Test CA'), ...subject('', commonName), alias, ...keys });
  return device;
}

// Signs a request for `subject` with names `sans` (openssl -addext text) by
// the device's local CA, and imports the signed certificate with the
// request's key.
async function signAndImport({ root, folder }, subject, sans) {
  const file = (name) => path.join(folder, name);
  await run('openssl', ['req', '-new', '-newkey', 'rsa:2048', '-nodes', '-keyout',
    file('signed.key'), '-subj', subject, '-addext', sans, '-out', file('signed.csr')]);
  await call(root, 'ORVA.Core.Certificate.CSR', 'sign', { days: 825, csr: 'signed.csr' },
    ['--upload', `csr=${file('signed.csr')}`]);
  await call(root, 'ORVA.Core.Certificate', 'export', { file: 'signed_set' },
    ['--output', file('signed.zip')]);
  await run('7z', ['x', '-y', `-o${file('signed')}`, file('signed.zip')]);
  await call(root, 'ORVA.Core.Certificate', 'import', {},
    ['--upload', `cert=${file('signed/server.crt')}`, '--upload', `key=${file('signed.key')}`]);
}

// Each client resolves when it accepted the server's certificate for `name`.
const CLIENTS = {
  curl: ({ root, port, name }) => run('curl', ['-sSf', '-o', '/dev/null', '--cacert',
    caFile(root), '--connect-to', `${name}:443:127.0.0.1:${port}`, `https://${name}/`]),
  'Python strict': ({ root, port, name }) => run('python3', ['-c', `
import socket, ssl, sys
context = ssl.create_default_context(cafile=sys.argv[1])
context.verify_flags |= ssl.VERIFY_X509_STRICT
with socket.create_connection(("127.0.0.1", int(sys.argv[2]))) as raw:
    context.wrap_socket(raw, server_hostname=sys.argv[3]).close()`, caFile(root), port, name]),
  // It ends with an error when the server closes after the handshake, so
  // only the completed handshake counts, which a failed verification stops.
  'gnutls-cli': async ({ root, port, name }) => {
    const out = await run('gnutls-cli', ['--x509cafile', caFile(root), '--verify-hostname',
      name, '-p', String(port), '127.0.0.1'], { timeout: 20_000 }).catch((error) => error);
    if (!out.stdout?.includes('Handshake was completed')) throw new Error(out.stdout ?? out);
  },
  // Trusts the local CA through a private NSS database; a certificate error
  // ends the navigation with net::ERR_CERT_...
  Chromium: async ({ root, port, name }) => {
    const home = path.join(path.dirname(root), `chromium-${name}`);
    const nss = path.join(home, '.pki/nssdb');
    await mkdir(nss, { recursive: true });
    await run('certutil', ['-N', '-d', `sql:${nss}`, '--empty-password']);
    await run('certutil', ['-A', '-d', `sql:${nss}`, '-n', 'Device CA', '-t', 'C,,', '-i', caFile(root)]);
    const browser = await chromium.launch({ executablePath: '/usr/bin/chromium',
      env: { ...process.env, HOME: home }, args: [`--host-resolver-rules=MAP ${name} 127.0.0.1`] });
    try {
      await (await browser.newPage()).goto(`https://${name}:${port}/`);
    } finally {
      await browser.close();
    }
  },
};

// `reached`: the names clients use; `listed`: the names "list" shows; `keys`
// the key parameters of CRT create and `key`, `caKey` the keys "list" then
// shows (RSA 2048 when not given).
const RSA = { type: 'RSA', bits: 2048 };
const CASES = [
  {
    what: 'CRT create, aliases and e-mail', alias: 'nas.example;DEVICE.example;10.0.0.7', email: true,
    reached: ['device.example', 'nas.example', '10.0.0.7'],
    listed: ['DNS:device.example', 'DNS:nas.example', 'IP:10.0.0.7', 'email:admin@device.example'],
  },
  {
    what: 'CRT create, no alias, EC keys (P-256 server, P-384 CA)', reached: ['device.example'],
    keys: { key_type: 'ec', key_length: 256, ca_key_type: 'ec', ca_key_length: 384 },
    key: { type: 'EC', curve: 'P-256' }, caKey: { type: 'EC', curve: 'P-384' },
  },
  { what: 'CRT create, no alias, an IP address as common name', reached: ['127.0.0.1'] },
  {
    what: 'CSR sign, names from the request', reached: ['signed.example', 'alt.example', '10.0.0.9'],
    request: 'subjectAltName=DNS:alt.example,IP:10.0.0.9',
  },
];

test('every client accepts every certificate the device makes, by every name', { timeout: 600_000 }, async (t) => {
  const matrix = [];
  for (const c of CASES) {
    const [commonName] = c.reached;
    const device = await createDevice(t, { ...c, commonName: c.request ? 'device.example' : commonName });
    const { root } = device;
    if (c.request) await signAndImport(device, `/CN=${commonName}`, c.request);
    const { certificates } = await call(root, 'ORVA.Core.Certificate', 'list',
      { additional: '["names","key","fingerprint","compatibility"]' });
    assert.deepEqual(certificates.map(({ type, key, compatibility }) => ({ type, key, compatibility })),
      [{ type: 'server_cert', key: c.key ?? RSA, compatibility: [] },
        { type: 'root_cert', key: c.caKey ?? RSA, compatibility: [] }], c.what);
    if (c.listed) {
      const { fingerprint256 } = new X509Certificate(await readFile(serverFile(root)));
      assert.deepEqual(certificates[0], { ...certificates[0], names: c.listed, fingerprint: fingerprint256 });
    }
    const { port } = new URL((await serve(device)).https);
    for (const [client, accepts] of Object.entries(CLIENTS)) {
      for (const name of c.reached) {
        const cell = await accepts({ root, port, name }).then(() => 'pass',
          (error) => `FAIL ${String(error.stderr || error.message).trim().split('\n').pop()}`);
        matrix.push(`${c.what} | ${client} | ${name} | ${cell}`);
      }
    }
  }
  for (const row of ['case | client | name | result', ...matrix]) t.diagnostic(row);
  assert.deepEqual(matrix.filter((row) => !row.endsWith('| pass')), []);
});
