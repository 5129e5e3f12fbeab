// The certificate manager page in headless Chromium against the real server
// on loopback. Each test has its own device root, server and browser.

import assert from 'node:assert/strict';
import { mkdtemp, readdir, readFile } from 'node:fs/promises';
import path from 'node:path';
import { test } from 'node:test';

import { HOST_BINARY, openDevice, run, screenshot } from './support/device.mjs';
import { makeChain, makeRequest, openssl, publicKeyOf } from './support/openssl_files.mjs';

const SLOW = { timeout: 180_000 };
const WAIT = { timeout: 60_000 };
const SSL = 'usr/orva/etc/ssl';

// Installs a local CA and server certificate from the command line, which
// fails unless the device answers with success.
async function withLocalCa(root) {
  const subject = (prefix, fields) => ['country', 'state', 'city', 'organization', 'department',
    'common_name', 'email'].map((name) => `${prefix}${name}=${fields[name] ?? ''}`);
  const server = { country: 'DE', organization: 'Device Maker', common_name: 'device.example' };
  await run(HOST_BINARY, ['call', '--root', root, 'ORVA.Core.Certificate.CRT', 'create',
    ...subject('ca_', { country: 'DE', common_name: 'Device Test CA' }), ...subject('', server)]);
}

// The rows of the certificate table once it has loaded (and holds exactly
// `count` rows: the last row is the count-th).
async function tableRows(page, count) {
  const last = count ? ` tbody tr:nth-child(${count}):last-child` : '';
  await page.locator(`section[aria-busy="false"] #certificate-table${last}`)
    .waitFor({ state: 'attached', ...WAIT });
  return page.$$eval('#certificate-table tbody tr', (rows) => rows.map((row) => {
    const [role, subject, issuer, algorithm, , , daysLeft] =
      [...row.cells].map((cell) => cell.textContent.trim());
    return { role, subject, issuer, algorithm, daysLeft, state: row.dataset.state };
  }));
}

async function signIn({ page, token }) {
  await page.locator('#token-input').fill(token);
  await page.locator('#token-input').press('Enter');
  return tableRows(page);
}

// Opens the action's section and returns its form.
async function openForm(page, action) {
  await page.locator(`#${action} > summary`).click();
  return page.locator(`form[data-action="${action}"]`);
}

// Waits until the form's message is a success or an error; returns its tone and text.
async function formOutcome(form) {
  const message = form.locator('[data-message]:is([data-tone="success"], [data-tone="error"])');
  await message.waitFor(WAIT);
  return { tone: await message.getAttribute('data-tone'), text: await message.textContent() };
}

// Submits the form and unpacks the ZIP archive it downloads. Resolves with
// the archive's name and holding(text): the member file holding that text.
async function submitForDownload({ page, folder }, form) {
  const [download] = await Promise.all([
    page.waitForEvent('download', WAIT), form.locator('button[type="submit"]').click()]);
  const into = await mkdtemp(path.join(folder, 'download-'));
  await run('7z', ['x', `-o${into}`, await download.path()]);
  const files = await Promise.all((await readdir(into)).map(async (name) =>
    ({ file: path.join(into, name), text: await readFile(path.join(into, name), 'latin1') })));
  return {
    name: download.suggestedFilename(),
    holding: (text) => files.find((member) => member.text.includes(text))?.file,
  };
}

test('asks for the access token once a session and again when it is refused', SLOW, async (t) => {
  const device = await openDevice(t);
  const { page } = device;
  assert.equal(await page.locator('#main').isVisible(), false, 'nothing is shown before the token');
  assert.equal(await page.evaluate(() => document.activeElement.id), 'token-input');
  await screenshot(page, '01-token-asked');

  await page.locator('#token-input').fill('not-the-device-token');
  await page.locator('#token-input').press('Enter');
  await page.locator('#token-reason', { hasText: 'did not accept' }).waitFor(WAIT);
  assert.equal(await page.locator('#main').isVisible(), false);

  assert.deepEqual(await signIn(device), []);
  assert.match(await page.locator('#empty-store').innerText(),
    /No certificate is installed[^]*Create a local certificate authority[^]*Import a certificate/);
  await screenshot(page, '02-empty-store');

  await page.reload();
  await page.locator('#empty-store').waitFor(WAIT);
  assert.equal(await page.locator('#token-gate').isVisible(), false, 'the token is kept');
  await page.locator('#empty-store a[href="#import"]').click();
  assert.equal(await page.evaluate(() => document.activeElement.textContent),
    'Import a certificate');

  const exportForm = await openForm(page, 'export');
  await exportForm.locator('button[type="submit"]').click();
  assert.deepEqual(await formOutcome(exportForm), { tone: 'error', text: 'The download failed. ' +
    'There was nothing to download: no certificate is installed. (error 500)' });

  await page.locator('#forget-token').click();
  assert.equal(await page.locator('#token-gate').isVisible(), true);
  assert.equal(await page.evaluate(() => sessionStorage.length), 0, 'the token is gone');
  // Besides the refused token, the browser reports only the export's empty answer.
  assert.deepEqual(device.consoleErrors.filter((error) => !/status of 401/.test(error)),
    ['Failed to load resource: the server responded with a status of 500 (Internal Server Error)']);
});

test('creates a request to download with its key once, and a local CA and server certificate ' +
  'with the keyboard alone', SLOW, async (t) => {
  const device = await openDevice(t, { https: true });
  const { page } = device;
  await signIn(device);
  const csrForm = await openForm(page, 'csr-create');
  await csrForm.locator('[name="country"]').fill('GB');
  await csrForm.locator('[name="common_name"]').fill('files.example.co.uk');
  await csrForm.locator('[name="key_length"]').selectOption('3072');

  const archive = await submitForDownload(device, csrForm);
  assert.equal(archive.name, 'archive.zip');
  const request = archive.holding('BEGIN CERTIFICATE REQUEST');
  const key = archive.holding('PRIVATE KEY');
  assert.match(await openssl('req', '-in', request, '-noout', '-subject'),
    /C\s*=\s*GB.*CN\s*=\s*files\.example\.co\.uk/);
  assert.equal(await publicKeyOf('pkey', key), await publicKeyOf('req', request));
  assert.match(await openssl('pkey', '-in', key, '-noout', '-text'), /3072 bit/);

  const handedOut = await formOutcome(csrForm);
  assert.equal(handedOut.tone, 'success', handedOut.text);
  assert.match(handedOut.text, /only copy of the new key/);
  await assert.rejects(readFile(path.join(device.root, SSL, '.gen/server.key')),
    'the device hands the pending set out once');
  assert.equal(await page.locator('#certificate-table').isVisible(), false, 'nothing installed');
  await screenshot(page, '03-request-downloaded');

  let creates = 0;
  page.on('request', (request) => {
    if ((request.postData() || '').includes('api=ORVA.Core.Certificate.CRT')) creates += 1;
  });
  async function tabTo(selector) {
    for (let presses = 0; presses < 60; presses += 1) {
      if (await page.evaluate((wanted) => document.activeElement.matches(wanted), selector)) return;
      await page.keyboard.press('Tab');
    }
    assert.fail(`${selector} cannot be reached with the Tab key`);
  }
  await page.evaluate(() => document.activeElement.blur());
  await tabTo('#crt-create > summary');
  await page.keyboard.press('Enter');
  for (const [field, text] of [['country', 'de'], ['organization', 'Example Storage'],
    ['common_name', 'nas.example.com'], ['alias', 'nas\n192.168.1.20'], ['ca_country', 'DE'],
    ['ca_common_name', 'Example Storage CA']]) {
    await tabTo(`#crt-create-${field}`);
    await page.keyboard.press('Control+A');
    await page.keyboard.type(text);
  }
  await tabTo('form[data-action="crt-create"] button[type="submit"]');
  await page.keyboard.press('Enter');

  const createForm = page.locator('form[data-action="crt-create"]');
  const button = createForm.locator('button[type="submit"]');
  assert.equal(await button.getAttribute('aria-disabled'), 'true');
  assert.equal(await button.textContent(), 'Working…');
  await screenshot(page, '04-creating-busy');
  await page.keyboard.press('Enter');
  await page.keyboard.press('Enter');

  const outcome = await formOutcome(createForm);
  assert.equal(outcome.tone, 'success', outcome.text);
  assert.match(outcome.text, /installed.*management web server is restarting/);
  assert.match(await page.locator('#page-notice').textContent(), /reload it/);
  assert.equal(creates, 1, 'a busy form is not sent again');
  assert.equal(await button.textContent(), 'Create and install');

  const rows = await tableRows(page, 2);
  assert.deepEqual(rows.map((row) => row.role), ['Server', 'Local CA']);
  assert.match(rows[0].subject, /^nas\.example\.com.*Example Storage/);
  assert.match(rows[0].issuer, /^Example Storage CA/);
  assert.match(rows[1].subject, /^Example Storage CA.*Self-signed/);
  for (const row of rows) {
    const days = Number(row.daysLeft);
    assert.ok(days >= 3648 && days <= 3650, `${row.role}: ${row.daysLeft} days left`);
    assert.equal(row.state, 'valid');
    assert.match(row.algorithm, /sha256/i);
  }
  await screenshot(page, '05-created-table');
  assert.deepEqual(device.consoleErrors, []);
});

test('refuses a key that does not belong to the certificate, changing nothing, then imports ' +
  'a set made with plain openssl, with an intermediate, and lists three rows', SLOW, async (t) => {
  const device = await openDevice(t, { prepare: withLocalCa });
  const { page } = device;
  const rowsBefore = await signIn(device);
  const chain = await makeChain(device.folder, 20);
  const installed = ['ssl.crt/server.crt', 'ssl.key/server.key']
    .map((file) => path.join(device.root, SSL, file));
  const before = await Promise.all(installed.map((file) => readFile(file)));
  const importForm = await openForm(page, 'import');
  async function importFiles(cert, key, intermediate = []) {
    await importForm.locator('[name="cert"]').setInputFiles(cert);
    await importForm.locator('[name="key"]').setInputFiles(key);
    await importForm.locator('[name="inter_cert"]').setInputFiles(intermediate);
    await importForm.locator('button[type="submit"]').click();
    return formOutcome(importForm);
  }

  for (const [cert, key, sentence] of [
    [chain.serverCert, chain.rootKey,
      'The private key does not belong to the certificate. Nothing was changed. (error 5514)'],
    [chain.serverKey, chain.serverKey, 'The certificate file is not a PEM certificate'],
  ]) {
    const outcome = await importFiles(cert, key);
    assert.equal(outcome.tone, 'error', sentence);
    assert.ok(outcome.text.startsWith(sentence), outcome.text);
    if (sentence.includes('5514')) await screenshot(page, '06-mismatching-key');
  }
  assert.deepEqual(await Promise.all(installed.map((file) => readFile(file))), before,
    'the installed certificate and key are untouched');
  await page.locator('#refresh-table').click();
  assert.deepEqual(await tableRows(page), rowsBefore);

  const outcome = await importFiles(chain.serverCert, chain.serverKey, chain.intermediateCert);
  assert.equal(outcome.tone, 'success', outcome.text);
  assert.match(outcome.text, /certificate is installed.*secure services restarted/);
  assert.equal(await importForm.locator('[name="cert"]').inputValue(), '', 'files are cleared');
  const rows = await tableRows(page, 3);
  assert.deepEqual(rows.map((row) => [row.role, row.state]),
    [['Server', 'expiring'], ['Local CA', 'valid'], ['Intermediate', 'valid']]);
  assert.match(rows[0].subject, /^files\.example\.com.*Example GmbH/);
  assert.match(rows[0].issuer, /^Example Intermediate CA/);
  assert.match(rows[0].daysLeft, /^(19|20)Expires soon$/);
  assert.match(rows[2].subject, /^Example Intermediate CA/);
  assert.match(rows[2].issuer, /^Example Root CA/);
  await screenshot(page, '07-imported-three-rows');
  assert.equal(await page.$eval('.table-wrap', (wrap) => wrap.scrollWidth <= wrap.clientWidth),
    true, 'the table fits a wide screen without scrolling sideways');

  // A narrow screen shows every certificate as a block, without sideways scrolling.
  await page.setViewportSize({ width: 360, height: 800 });
  const pageWidth = await page.evaluate(() => document.documentElement.scrollWidth);
  assert.ok(pageWidth <= 360, `the page is ${pageWidth}px wide`);
  assert.equal(await page.$eval('#certificate-table tbody td:last-child',
    (cell) => getComputedStyle(cell, '::before').content), '"Days left"');
  await screenshot(page, '08-narrow-screen');
  assert.deepEqual(device.consoleErrors, []);
});

test('signs an uploaded request with the local CA, renews the installed certificate\'s ' +
  'request and exports the installed set, each as a download', SLOW, async (t) => {
  const device = await openDevice(t, { prepare: withLocalCa });
  const { page } = device;
  await signIn(device);
  const client = await makeRequest(device.folder, 'client', '/C=FR/CN=client.example.org');

  const signForm = await openForm(page, 'csr-sign');
  await signForm.locator('[name="days"]').fill('0');
  await signForm.locator('[name="csr"]').setInputFiles(client.csr);
  await signForm.locator('button[type="submit"]').click();
  assert.match(await signForm.locator('[data-message]').textContent(), /from 1 to 36500/);
  assert.equal(await page.evaluate(() => document.activeElement.id), 'csr-sign-days');

  await signForm.locator('[name="days"]').fill('20');
  await signForm.locator('[name="alias"]').fill('client.example.org\nclient');
  const signed = (await submitForDownload(device, signForm)).holding('BEGIN CERTIFICATE-----');
  const localCa = path.join(device.root, SSL, 'ssl.crt/ca.crt');
  assert.match(await openssl('verify', '-CAfile', localCa, signed), /OK/);
  const text = await openssl('x509', '-in', signed, '-noout', '-subject', '-enddate',
    '-ext', 'subjectAltName');
  assert.match(text, /CN\s*=\s*client\.example\.org/);
  assert.match(text, /DNS:client\.example\.org, DNS:client/);
  assert.equal(await publicKeyOf('x509', signed), await publicKeyOf('pkey', client.key));
  const daysValid = (Date.parse(/notAfter=(.*)/.exec(text)[1]) - Date.now()) / 86_400_000;
  assert.ok(daysValid > 19 && daysValid <= 20, `valid for ${daysValid} days`);

  const outcome = await formOutcome(signForm);
  assert.equal(outcome.tone, 'success', outcome.text);
  assert.match(outcome.text, /no longer keeps it/);
  await screenshot(page, '09-request-signed');

  const renewForm = await openForm(page, 'csr-renew');
  const renewed = await submitForDownload(device, renewForm);
  assert.ok(renewed.holding('PRIVATE KEY'));
  assert.match(await openssl('req', '-in', renewed.holding('BEGIN CERTIFICATE REQUEST'), '-noout',
    '-subject'), /CN\s*=\s*device\.example/);
  assert.equal((await formOutcome(renewForm)).tone, 'success');

  const exportForm = await openForm(page, 'export');
  const exported = await submitForDownload(device, exportForm);
  const installedCert = await readFile(path.join(device.root, SSL, 'ssl.crt/server.crt'), 'latin1');
  assert.ok(exported.holding(installedCert), 'the installed server certificate is in the archive');
  assert.ok(exported.holding('PRIVATE KEY'));
  assert.match((await formOutcome(exportForm)).text, /holds private keys/);
  assert.deepEqual(device.consoleErrors, []);
});
