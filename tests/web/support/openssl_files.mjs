// Certificate files made with the plain openssl tool, as an administrator
// would bring them from elsewhere.

import { writeFile } from 'node:fs/promises';
import path from 'node:path';

import { run } from './device.mjs';

export async function openssl(...args) {
  return (await run('openssl', args)).stdout;
}

// The public key of a key ('pkey'), request ('req') or certificate ('x509') file.
export function publicKeyOf(kind, file) {
  return openssl(kind, '-in', file, ...(kind === 'pkey' ? ['-pubout'] : ['-noout', '-pubkey']));
}

// A new RSA key and a signing request for `subject` ("/C=DE/CN=...") in `folder`.
export async function makeRequest(folder, name, subject) {
  const key = path.join(folder, `${name}.key`);
  const csr = path.join(folder, `${name}.csr`);
  await openssl('genpkey', '-algorithm', 'RSA', '-pkeyopt', 'rsa_keygen_bits:2048', '-out', key);
  await openssl('req', '-new', '-key', key, '-subj', subject, '-out', csr);
  return { key, csr };
}

// root CA -> intermediate CA -> server certificate valid for `serverDays`;
// the root's key belongs to none of the three files handed out.
export async function makeChain(folder, serverDays) {
  const file = (name) => path.join(folder, name);
  await writeFile(file('ca.ext'),
    'basicConstraints=critical,CA:TRUE\nkeyUsage=keyCertSign,cRLSign\n');
  const root = await makeRequest(folder, 'root', '/C=DE/O=Example Trust/CN=Example Root CA');
  await openssl('x509', '-req', '-in', root.csr, '-signkey', root.key, '-days', '3650',
    '-extfile', file('ca.ext'), '-out', file('root.crt'));
  const intermediate = await makeRequest(folder, 'intermediate',
    '/C=DE/O=Example Trust/CN=Example Intermediate CA');
  await openssl('x509', '-req', '-in', intermediate.csr, '-CA', file('root.crt'), '-CAkey',
    root.key, '-days', '1800', '-extfile', file('ca.ext'), '-out', file('intermediate.crt'));
  const server = await makeRequest(folder, 'server', '/C=DE/O=Example GmbH/CN=files.example.com');
  await openssl('x509', '-req', '-in', server.csr, '-CA', file('intermediate.crt'),
    '-CAkey', intermediate.key, '-days', String(serverDays), '-out', file('server.crt'));
  return {
    serverCert: file('server.crt'), serverKey: server.key,
    intermediateCert: file('intermediate.crt'), rootKey: root.key,
  };
}
