// Real TLS clients against the device's own HTTPS, presenting certificates
// the device made: every client must accept every one by every name it was
// made for, and each one must keep Apple's rules for TLS certificates.

import assert from 'node:assert/strict';
import { X509Certificate } from 'node:crypto';
import { readFile } from 'node:fs/promises';
import { test } from 'node:test';

import {
  call, caFile, createDevice, run, serveHttps, serverFile, signAndImport,
} from './https_device.mjs';

const isAddress = (name) => /^[\d.]+$/.test(name);

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
  'openssl verify': ({ root, name }) => run('openssl', ['verify', '-x509_strict', '-purpose',
    'sslserver', '-CAfile', caFile(root), isAddress(name) ? '-verify_ip' : '-verify_hostname',
    name, serverFile(root)]),
  // It ends with an error when the server closes after the handshake, so
  // only the completed handshake counts, which a failed verification stops.
  'gnutls-cli': async ({ root, port, name }) => {
    const out = await run('gnutls-cli', ['--x509cafile', caFile(root), '--verify-hostname',
      name, '-p', String(port), '127.0.0.1'], { timeout: 20_000 }).catch((error) => error);
    if (!out.stdout?.includes('Handshake was completed')) throw new Error(out.stdout ?? out);
  },
};

// Apple's rules for TLS server certificates and the CAs that issue them
// (private CAs included): the rules the certificate in `file` breaks, as
// sentences; a server certificate for `name`.
async function appleRuleBreaks(file, server, name) {
  const certificate = new X509Certificate(await readFile(file));
  const key = certificate.publicKey;
  const text = (await run('openssl', ['x509', '-noout', '-text', '-in', file])).stdout;
  const breaks = [];
  if (key.asymmetricKeyType === 'rsa' && key.asymmetricKeyDetails.modulusLength < 2048) {
    breaks.push('RSA key below 2048 bits');
  }
  if (!/Signature Algorithm: \S*(sha256|sha384|sha512)/i.test(text)) breaks.push('no SHA-2 signature');
  if (!server) return breaks;
  const names = (certificate.subjectAltName ?? '').split(', ');
  if (!names.includes(`${isAddress(name) ? 'IP Address' : 'DNS'}:${name}`)) breaks.push(`${name} not in subjectAltName`);
  const usages = certificate.extKeyUsage ?? certificate.keyUsage ?? [];
  if (!usages.includes('1.3.6.1.5.5.7.3.1')) breaks.push('no serverAuth usage');
  const days = (Date.parse(certificate.validTo) - Date.parse(certificate.validFrom)) / 86_400_000;
  if (days > 825) breaks.push(`valid for ${days} days`);
  return breaks;
}

// `reached`: the names clients use; `listed`: the names "list" shows.
const CASES = [
  { what: 'CRT create, no alias, no e-mail', reached: ['device.example'] },
  { what: 'CRT create, no alias, e-mail', reached: ['device.example'], email: true },
  {
    what: 'CRT create, aliases, no e-mail', alias: 'nas.example;10.0.0.7',
    reached: ['device.example', 'nas.example', '10.0.0.7'],
  },
  {
    what: 'CRT create, aliases and e-mail', alias: 'nas.example;DEVICE.example;10.0.0.7', email: true,
    reached: ['device.example', 'nas.example', '10.0.0.7'],
    listed: ['DNS:device.example', 'DNS:nas.example', 'IP:10.0.0.7', 'email:admin@device.example'],
  },
  { what: 'CRT create, address as common name', reached: ['127.0.0.1'] },
  {
    what: 'CRT create, EC keys (P-256 server, P-384 CA)', alias: 'nas.example',
    reached: ['device.example', 'nas.example'],
    keys: { key_type: 'ec', key_length: 256, ca_key_type: 'ec', ca_key_length: 384 },
  },
  {
    what: 'CSR sign, names from the request', reached: ['signed.example', 'alt.example', '10.0.0.9'],
    request: 'subjectAltName=DNS:alt.example,IP:10.0.0.9',
  },
];

test('every client accepts every certificate the device makes, by every name', { timeout: 600_000 }, async (t) => {
  const matrix = [];
  for (const c of CASES) {
    const [commonName] = c.reached;
    const { root, folder } = await createDevice(t, { ...c, commonName: c.request ? 'device.example' : commonName });
    const server = c.request ? await signAndImport(root, folder, `/CN=${commonName}`, c.request)
      : serverFile(root);
    assert.deepEqual(await appleRuleBreaks(caFile(root), false), [], c.what);
    assert.deepEqual(await appleRuleBreaks(server, true, commonName), [], c.what);
    if (c.listed) {
      const [entry] = (await call(root, 'ORVA.Core.Certificate', 'list', { type: 'server_cert',
        additional: '["names","key","fingerprint","compatibility"]' })).certificates;
      const { fingerprint256 } = new X509Certificate(await readFile(server));
      assert.deepEqual(entry, { ...entry, names: c.listed, key: { type: 'RSA', bits: 2048 },
        fingerprint: fingerprint256, compatibility: [] });
    }
    const port = await serveHttps(t, root);
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
