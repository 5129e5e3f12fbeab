// Certificate files made with the plain openssl tool, as an administrator
// would bring them from elsewhere.

import { execFile } from 'node:child_process';
import { mkdtemp, rm, writeFile } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';
import { promisify } from 'node:util';

import { atTestEnd } from './cleanup.mjs';

const run = promisify(execFile);

export async function openssl(...args) {
  const { stdout } = await run('openssl', args);
  return stdout;
}

// A scratch folder for test `t`, removed when the test ends.
export async function scratchFolder(t) {
  const folder = await mkdtemp(path.join(os.tmpdir(), 'orva-web-files-'));
  atTestEnd(t, () => rm(folder, { recursive: true, force: true }));
  return folder;
}

async function newKey(file) {
  await openssl('genpkey', '-algorithm', 'RSA', '-pkeyopt', 'rsa_keygen_bits:2048', '-out', file);
}

// A key and a signing request for `subject` ("/C=DE/CN=...").
export async function makeRequest(folder, name, subject) {
  const key = path.join(folder, `${name}.key`);
  const csr = path.join(folder, `${name}.csr`);
  await newKey(key);
  await openssl('req', '-new', '-key', key, '-subj', subject, '-out', csr);
  return { key, csr };
}

// root CA -> intermediate CA -> server certificate (valid for `serverDays`),
// plus a key that belongs to none of them.
export async function makeChain(folder, serverDays = 400) {
  const file = (name) => path.join(folder, name);
  const caExtensions = file('ca.ext');
  await writeFile(caExtensions, 'basicConstraints=critical,CA:TRUE\nkeyUsage=keyCertSign,cRLSign\n');

  await newKey(file('root.key'));
  await openssl('req', '-x509', '-new', '-key', file('root.key'), '-subj',
    '/C=DE/O=Example Trust/CN=Example Root CA', '-days', '3650', '-out', file('root.crt'));

  const intermediate = await makeRequest(folder, 'intermediate',
    '/C=DE/O=Example Trust/CN=Example Intermediate CA');
  await openssl('x509', '-req', '-in', intermediate.csr, '-CA', file('root.crt'),
    '-CAkey', file('root.key'), '-CAcreateserial', '-days', '1800',
    '-extfile', caExtensions, '-out', file('intermediate.crt'));

  const server = await makeRequest(folder, 'server', '/C=DE/O=Example GmbH/CN=files.example.com');
  await openssl('x509', '-req', '-in', server.csr, '-CA', file('intermediate.crt'),
    '-CAkey', intermediate.key, '-CAcreateserial', '-days', String(serverDays),
    '-out', file('server.crt'));

  const strayKey = file('stray.key');
  await newKey(strayKey);
  return {
    serverCert: file('server.crt'),
    serverKey: server.key,
    intermediateCert: file('intermediate.crt'),
    rootCert: file('root.crt'),
    strayKey,
  };
}

// The public key of a key, request or certificate file, as PEM text.
export async function publicKeyOf(file, kind) {
  if (kind === 'key') return openssl('pkey', '-in', file, '-pubout');
  if (kind === 'csr') return openssl('req', '-in', file, '-noout', '-pubkey');
  return openssl('x509', '-in', file, '-noout', '-pubkey');
}
