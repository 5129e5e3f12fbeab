// Headless Chromium that trusts the device's local CA through a private NSS
// database loads the page over the device's own HTTPS without a certificate
// error, and the page tells the verdict on the installed certificate.

import assert from 'node:assert/strict';
import { mkdir } from 'node:fs/promises';
import path from 'node:path';
import { test } from 'node:test';

import { chromium } from 'playwright-core';

import {
  caFile, createDevice, run, serveHttps, signAndImport, token,
} from '../clients/https_device.mjs';

const WAIT = { timeout: 60_000 };

const CASES = [
  { what: 'CRT create without an alias', name: 'device.example', form: true },
  { what: 'an IP address as common name', name: '127.0.0.1' },
  {
    what: 'a request signed by the local CA for 1000 days, imported', name: 'signed.example',
    signedDays: 1000, warning: 'Safari and iOS will refuse it: it is valid for more than 825 days.',
  },
];

for (const c of CASES) {
  test(`Chromium accepts the device's HTTPS: ${c.what}`, { timeout: 240_000 }, async (t) => {
    const { root, folder } = await createDevice(t, { commonName: c.signedDays ? 'device.example' : c.name });
    if (c.signedDays) await signAndImport(root, folder, `/CN=${c.name}`, '', c.signedDays);
    const nss = path.join(folder, '.pki/nssdb');
    await mkdir(nss, { recursive: true });
    await run('certutil', ['-N', '-d', `sql:${nss}`, '--empty-password']);
    await run('certutil', ['-A', '-d', `sql:${nss}`, '-n', 'Device CA', '-t', 'C,,', '-i', caFile(root)]);
    const port = await serveHttps(t, root);
    const browser = await chromium.launch({
      executablePath: '/usr/bin/chromium', env: { ...process.env, HOME: folder },
      args: [`--host-resolver-rules=MAP ${c.name} 127.0.0.1`],
    });
    t.after(() => browser.close());
    const page = await browser.newPage();
    // A certificate error ends the navigation with net::ERR_CERT_...
    assert.equal((await page.goto(`https://${c.name}:${port}/`)).status(), 200);
    await page.locator('#token-input').fill(await token(root));
    await page.locator('#token-input').press('Enter');
    const warnings = page.locator('tr[data-role="server_cert"] td.warnings');
    await warnings.waitFor(WAIT);
    assert.equal(await warnings.textContent(), c.warning ?? 'None');
    if (!c.form) return;

    await page.locator('#csr-sign > summary').click();
    const days = page.locator('#csr-sign-days');
    assert.equal(await days.inputValue(), '825');
    await days.fill('1000');
    assert.equal(await page.locator('#csr-sign-days-note').textContent(),
      'Safari and iOS refuse a server certificate valid for more than 825 days; other clients accept it.');
  });
}
