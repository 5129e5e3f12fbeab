// The certificate manager page in headless Chromium against the real server
// on loopback. Each test has its own device root, server and browser.

import assert from 'node:assert/strict';
import { access, readFile, writeFile } from 'node:fs/promises';
import path from 'node:path';
import { test } from 'node:test';

import { openBrowser, screenshot } from './support/browser.mjs';
import { callMethod, startDeviceServer } from './support/device_server.mjs';
import {
  makeChain, makeRequest, openssl, publicKeyOf, scratchFolder,
} from './support/openssl_files.mjs';
import { zipMembers } from './support/zip_members.mjs';

const TEST_TIMEOUT_MS = 180_000;
const WAIT_MS = 60_000;

const SSL = 'usr/orva/etc/ssl';
const DEVICE_CA_NAME = 'Device Test CA';
const DEVICE_SERVER_NAME = 'device.example';

// What the command line sends to make a local CA and server certificate
// before a test opens the page.
const DEVICE_SET = {
  ca_country: 'DE', ca_state: '', ca_city: '', ca_organization: 'Device Maker',
  ca_department: '', ca_common_name: DEVICE_CA_NAME, ca_email: '',
  country: 'DE', state: '', city: '', organization: 'Device Maker', department: '',
  common_name: DEVICE_SERVER_NAME, email: '',
};

async function withLocalCa(root) {
  const answer = await callMethod(root, 'ORVA.Core.Certificate.CRT', 'create', DEVICE_SET);
  assert.equal(answer.success, true, JSON.stringify(answer));
}

async function exists(file) {
  try {
    await access(file);
    return true;
  } catch {
    return false;
  }
}

// Opens the page with a device of its own, enters the token and waits for
// the first table.
async function signedIn(t, { prepare, https, viewport } = {}) {
  const server = await startDeviceServer(t, { prepare, https });
  const { page, consoleErrors } = await openBrowser(t, viewport);
  await page.goto(server.url);
  await page.locator('#token-input').fill(server.token);
  await page.locator('#token-input').press('Enter');
  await tableSettled(page);
  return { server, page, consoleErrors };
}

async function tableSettled(page) {
  await page.waitForFunction(() => {
    const section = document.getElementById('certificate-table').closest('section');
    return section.getAttribute('aria-busy') === 'false';
  }, null, { timeout: WAIT_MS });
}

// The rows of the certificate table as the page shows them.
function tableRows(page) {
  return page.$$eval('#certificate-table tbody tr', (rows) => rows.map((row) => ({
    role: row.cells[0].textContent.trim(),
    subject: row.cells[1].textContent.trim(),
    issuer: row.cells[2].textContent.trim(),
    algorithm: row.cells[3].textContent.trim(),
    validFrom: row.cells[4].textContent.trim(),
    validUntil: row.cells[5].textContent.trim(),
    daysLeft: row.cells[6].textContent.trim(),
    state: row.dataset.state,
  })));
}

async function waitForRowCount(page, count) {
  await page.waitForFunction((expected) => {
    const section = document.getElementById('certificate-table').closest('section');
    return section.getAttribute('aria-busy') === 'false' &&
      document.querySelectorAll('#certificate-table tbody tr').length === expected;
  }, count, { timeout: WAIT_MS });
  return tableRows(page);
}

function form(page, action) {
  return page.locator(`form[data-action="${action}"]`);
}

async function openAction(page, id) {
  await page.locator(`#${id} > summary`).click();
}

// Waits until the form's message has the tone ("success" or "error") and
// returns its text.
async function formOutcome(page, action) {
  const message = form(page, action).locator('[data-message]');
  await page.waitForFunction((element) => ['success', 'error'].includes(element.dataset.tone),
    await message.elementHandle(), { timeout: WAIT_MS });
  return { tone: await message.getAttribute('data-tone'), text: await message.textContent() };
}

// Clicks the form's submit button and resolves with the download it causes.
async function submitForDownload(page, action) {
  const [download] = await Promise.all([
    page.waitForEvent('download', { timeout: WAIT_MS }),
    form(page, action).locator('button[type="submit"]').click(),
  ]);
  const file = await download.path();
  return { name: download.suggestedFilename(), members: zipMembers(await readFile(file)) };
}

function memberHolding(members, header) {
  return members.find((member) => member.content.toString('latin1').includes(header));
}

function assertNoConsoleErrors(consoleErrors) {
  assert.deepEqual(consoleErrors, [], 'the page wrote errors to the console');
}

test('asks for the access token once a session and again when it is refused', {
  timeout: TEST_TIMEOUT_MS,
}, async (t) => {
  const server = await startDeviceServer(t);
  const { page, consoleErrors } = await openBrowser(t);
  await page.goto(server.url);

  assert.equal(await page.locator('#token-gate').isVisible(), true);
  assert.equal(await page.locator('#main').isVisible(), false, 'nothing is shown before the token');
  assert.equal(await page.evaluate(() => document.activeElement.id), 'token-input');
  await screenshot(page, '01-token-asked');

  await page.locator('#token-input').press('Enter');
  assert.match(await page.locator('#token-reason').textContent(), /Enter the access token/);

  await page.locator('#token-input').fill('not-the-device-token');
  await page.locator('#token-input').press('Enter');
  await page.locator('#token-reason', { hasText: 'did not accept' }).waitFor({ timeout: WAIT_MS });
  assert.equal(await page.locator('#main').isVisible(), false);

  await page.locator('#token-input').fill(server.token);
  await page.locator('#token-input').press('Enter');
  await page.locator('#empty-store').waitFor({ timeout: WAIT_MS });
  const emptyText = await page.locator('#empty-store').innerText();
  assert.match(emptyText, /No certificate is installed/);
  assert.match(emptyText, /Create a local certificate authority/);
  assert.match(emptyText, /Import a certificate/);
  assert.equal(await page.locator('#certificate-table').isVisible(), false);
  await screenshot(page, '02-empty-store');

  await page.reload();
  await page.locator('#empty-store').waitFor({ timeout: WAIT_MS });
  assert.equal(await page.locator('#token-gate').isVisible(), false, 'the token is kept for the session');

  await page.locator('#empty-store a[href="#import"]').click();
  assert.equal(await page.locator('#import').getAttribute('open'), '');
  assert.equal(await page.evaluate(() => document.activeElement.textContent), 'Import a certificate');

  // With nothing installed, the export has nothing to hand out and says so.
  await openAction(page, 'export');
  await form(page, 'export').locator('button[type="submit"]').click();
  const nothing = await formOutcome(page, 'export');
  assert.equal(nothing.tone, 'error');
  assert.match(nothing.text, /^The download failed\. There was nothing to download: no certificate is installed\./);

  await page.locator('#forget-token').click();
  assert.equal(await page.locator('#token-gate').isVisible(), true);
  assert.match(await page.locator('#token-reason').textContent(), /forgotten/);
  assert.equal(await page.evaluate(() => sessionStorage.length), 0, 'the token is gone');
  await page.locator('#token-input').fill(server.token);
  await page.locator('#token-input').press('Enter');
  await page.locator('#empty-store').waitFor({ timeout: WAIT_MS });

  // The browser reports the refused token, once per list request, and the
  // export's empty answer; nothing else.
  const refusals = consoleErrors.filter((error) => /status of 401/.test(error));
  assert.ok(refusals.length > 0);
  assert.deepEqual(consoleErrors.filter((error) => !refusals.includes(error)),
    ['Failed to load resource: the server responded with a status of 500 (Internal Server Error)']);
});

// The management web server serves HTTPS too, so a new certificate restarts it.
async function withHttps(root) {
  const conf = path.join(root, 'usr/orva/etc/orva.conf');
  const text = await readFile(conf, 'utf8');
  assert.match(text, /runHTTPS="no"/);
  await writeFile(conf, text.replace('runHTTPS="no"', 'runHTTPS="yes"'));
}

test('creates a local CA and server certificate with the keyboard alone, then lists both', {
  timeout: TEST_TIMEOUT_MS,
}, async (t) => {
  const { page, consoleErrors } = await signedIn(t, { prepare: withHttps, https: true });
  const creates = [];
  page.on('request', (request) => {
    if ((request.postData() || '').includes('api=ORVA.Core.Certificate.CRT')) creates.push(request);
  });

  // Tab from the top of the page to the action, open it, fill it in, send it.
  async function tabTo(selector) {
    for (let presses = 0; presses < 60; presses += 1) {
      if (await page.evaluate((wanted) => document.activeElement.matches(wanted), selector)) return;
      await page.keyboard.press('Tab');
    }
    assert.fail(`${selector} cannot be reached with the Tab key`);
  }
  async function typeInto(selector, text) {
    await tabTo(selector);
    await page.keyboard.press('Control+A');
    await page.keyboard.type(text);
  }
  await page.evaluate(() => document.activeElement.blur());
  await tabTo('#crt-create > summary');
  await page.keyboard.press('Enter');
  await typeInto('#crt-create-country', 'de');
  await typeInto('#crt-create-organization', 'Example Storage');
  await typeInto('#crt-create-common_name', 'nas.example.com');
  await typeInto('#crt-create-alias', 'nas\n192.168.1.20');
  await typeInto('#crt-create-ca_country', 'DE');
  await typeInto('#crt-create-ca_common_name', 'Example Storage CA');
  await tabTo('form[data-action="crt-create"] button[type="submit"]');
  await page.keyboard.press('Enter');

  const button = form(page, 'crt-create').locator('button[type="submit"]');
  assert.equal(await button.getAttribute('aria-disabled'), 'true');
  assert.equal(await button.textContent(), 'Working…');
  assert.equal(await form(page, 'crt-create').getAttribute('aria-busy'), 'true');
  assert.equal(await page.locator('#crt-create-common_name').isDisabled(), true);
  await screenshot(page, '03-creating-busy');
  await page.keyboard.press('Enter');
  await page.keyboard.press('Enter');

  const outcome = await formOutcome(page, 'crt-create');
  assert.equal(outcome.tone, 'success', outcome.text);
  assert.match(outcome.text, /installed/);
  assert.match(outcome.text, /management web server is restarting/);
  assert.match(await page.locator('#page-notice').textContent(), /reload it/);
  assert.equal(creates.length, 1, 'a busy form is not sent again');
  assert.equal(await button.getAttribute('aria-disabled'), 'false');
  assert.equal(await button.textContent(), 'Create and install');

  const rows = await waitForRowCount(page, 2);
  assert.deepEqual(rows.map((row) => row.role), ['Server', 'Local CA']);
  assert.match(rows[0].subject, /^nas\.example\.com/);
  assert.match(rows[0].subject, /Example Storage/);
  assert.match(rows[0].issuer, /^Example Storage CA/);
  assert.match(rows[1].subject, /Example Storage CA.*Self-signed/);
  for (const row of rows) {
    const days = Number(row.daysLeft);
    assert.ok(days >= 3648 && days <= 3650, `${row.role}: ${row.daysLeft} days left`);
    assert.equal(row.state, 'valid');
    assert.match(row.validUntil, /^\d{4}-\d{2}-\d{2} \d{2}:\d{2}\sUTC$/);
    assert.match(row.algorithm, /sha256/i);
  }
  await screenshot(page, '04-created-table');
  assertNoConsoleErrors(consoleErrors);
});

test('creates a request and downloads it with its key at once, once', {
  timeout: TEST_TIMEOUT_MS,
}, async (t) => {
  const { server, page, consoleErrors } = await signedIn(t);
  const folder = await scratchFolder(t);
  await openAction(page, 'csr-create');
  const csrForm = form(page, 'csr-create');
  await csrForm.locator('[name="country"]').fill('GB');
  await csrForm.locator('[name="organization"]').fill('Example Ltd');
  await csrForm.locator('[name="common_name"]').fill('files.example.co.uk');
  await csrForm.locator('[name="key_length"]').selectOption('3072');

  const archive = await submitForDownload(page, 'csr-create');
  assert.equal(archive.name, 'archive.zip');
  const request = memberHolding(archive.members, 'BEGIN CERTIFICATE REQUEST');
  const key = memberHolding(archive.members, 'PRIVATE KEY');
  assert.ok(request && key, `members: ${archive.members.map((member) => member.name)}`);
  await writeFile(path.join(folder, 'request.csr'), request.content);
  await writeFile(path.join(folder, 'request.key'), key.content);
  const subject = await openssl('req', '-in', path.join(folder, 'request.csr'), '-noout',
    '-subject', '-nameopt', 'sep_multiline');
  assert.match(subject, /CN=files\.example\.co\.uk/);
  assert.match(subject, /O=Example Ltd/);
  assert.match(subject, /C=GB/);
  assert.equal(await publicKeyOf(path.join(folder, 'request.key'), 'key'),
    await publicKeyOf(path.join(folder, 'request.csr'), 'csr'), 'the key belongs to the request');
  assert.match(await openssl('pkey', '-in', path.join(folder, 'request.key'), '-noout', '-text'),
    /3072 bit/);

  const outcome = await formOutcome(page, 'csr-create');
  assert.equal(outcome.tone, 'success', outcome.text);
  assert.match(outcome.text, /only copy of the new key/);
  assert.equal(await exists(path.join(server.root, SSL, '.gen/server.key')), false,
    'the device hands the pending set out once');
  assert.equal(await page.locator('#certificate-table').isVisible(), false, 'nothing was installed');
  await screenshot(page, '05-request-downloaded');
  assertNoConsoleErrors(consoleErrors);
});

test('imports a set made with plain openssl, with an intermediate, and lists three rows', {
  timeout: TEST_TIMEOUT_MS,
}, async (t) => {
  const { page, consoleErrors } = await signedIn(t, { prepare: withLocalCa });
  const chain = await makeChain(await scratchFolder(t));
  assert.equal((await tableRows(page)).length, 2);

  await openAction(page, 'import');
  const importForm = form(page, 'import');
  await importForm.locator('[name="cert"]').setInputFiles(chain.serverCert);
  await importForm.locator('[name="key"]').setInputFiles(chain.serverKey);
  await importForm.locator('[name="inter_cert"]').setInputFiles(chain.intermediateCert);
  await importForm.locator('button[type="submit"]').click();

  const outcome = await formOutcome(page, 'import');
  assert.equal(outcome.tone, 'success', outcome.text);
  assert.match(outcome.text, /certificate is installed/);
  assert.match(outcome.text, /secure services restarted/);
  assert.equal(await importForm.locator('[name="cert"]').inputValue(), '', 'files are cleared');

  const rows = await waitForRowCount(page, 3);
  assert.deepEqual(rows.map((row) => row.role), ['Server', 'Local CA', 'Intermediate']);
  assert.match(rows[0].subject, /^files\.example\.com.*Example GmbH/);
  assert.match(rows[0].issuer, /^Example Intermediate CA/);
  assert.match(rows[1].subject, new RegExp(`^${DEVICE_CA_NAME}`));
  assert.match(rows[2].subject, /^Example Intermediate CA/);
  assert.match(rows[2].issuer, /^Example Root CA/);
  const serverDays = Number(rows[0].daysLeft);
  assert.ok(serverDays >= 398 && serverDays <= 400, `server: ${rows[0].daysLeft} days left`);
  await screenshot(page, '06-imported-three-rows');
  assert.equal(await page.$eval('.table-wrap', (wrap) => wrap.scrollWidth <= wrap.clientWidth),
    true, 'the table fits a wide screen without scrolling sideways');

  // A narrow screen shows every certificate as a block, without sideways scrolling.
  await page.setViewportSize({ width: 360, height: 800 });
  await page.locator('#installed-title').scrollIntoViewIfNeeded();
  const widths = await page.evaluate(() => ({
    page: document.documentElement.scrollWidth,
    viewport: window.innerWidth,
  }));
  assert.ok(widths.page <= widths.viewport, `page ${widths.page}px wide in ${widths.viewport}px`);
  const labelShown = await page.$eval('#certificate-table tbody td:last-child',
    (cell) => getComputedStyle(cell, '::before').content);
  assert.equal(labelShown, '"Days left"');
  await screenshot(page, '07-narrow-screen');
  assertNoConsoleErrors(consoleErrors);
});

test('refuses a key that does not belong to the certificate and changes nothing', {
  timeout: TEST_TIMEOUT_MS,
}, async (t) => {
  const { server, page, consoleErrors } = await signedIn(t, { prepare: withLocalCa });
  const chain = await makeChain(await scratchFolder(t));
  const installedCert = path.join(server.root, SSL, 'ssl.crt/server.crt');
  const installedKey = path.join(server.root, SSL, 'ssl.key/server.key');
  const before = [await readFile(installedCert), await readFile(installedKey)];
  const rowsBefore = await tableRows(page);

  await openAction(page, 'import');
  const importForm = form(page, 'import');
  const cases = [
    { cert: chain.serverCert, key: chain.strayKey,
      sentence: 'The private key does not belong to the certificate. Nothing was changed. (error 5514)' },
    { cert: chain.serverKey, key: chain.serverKey,
      sentence: 'The certificate file is not a PEM certificate' },
  ];
  for (const { cert, key, sentence } of cases) {
    await importForm.locator('[name="cert"]').setInputFiles(cert);
    await importForm.locator('[name="key"]').setInputFiles(key);
    await importForm.locator('button[type="submit"]').click();
    const outcome = await formOutcome(page, 'import');
    assert.equal(outcome.tone, 'error');
    assert.ok(outcome.text.startsWith(sentence), outcome.text);
    if (sentence.includes('5514')) await screenshot(page, '08-mismatching-key');
  }

  assert.deepEqual([await readFile(installedCert), await readFile(installedKey)], before,
    'the installed certificate and key are untouched');
  await page.locator('#refresh-table').click();
  await tableSettled(page);
  assert.deepEqual(await tableRows(page), rowsBefore);
  assertNoConsoleErrors(consoleErrors);
});

test('signs an uploaded request with the local CA and downloads the certificate', {
  timeout: TEST_TIMEOUT_MS,
}, async (t) => {
  const { server, page, consoleErrors } = await signedIn(t, { prepare: withLocalCa });
  const folder = await scratchFolder(t);
  const client = await makeRequest(folder, 'client', '/C=FR/O=Client SA/CN=client.example.org');
  const chain = await makeChain(folder);

  await openAction(page, 'csr-sign');
  const signForm = form(page, 'csr-sign');
  await signForm.locator('[name="csr"]').setInputFiles(chain.serverCert);
  await signForm.locator('button[type="submit"]').click();
  const refused = await formOutcome(page, 'csr-sign');
  assert.equal(refused.tone, 'error');
  assert.match(refused.text, /^The file is not a certificate signing request/);

  await signForm.locator('[name="days"]').fill('0');
  await signForm.locator('[name="csr"]').setInputFiles(client.csr);
  await signForm.locator('button[type="submit"]').click();
  assert.match(await signForm.locator('[data-message]').textContent(), /from 1 to 36500/);
  assert.equal(await page.evaluate(() => document.activeElement.id), 'csr-sign-days');

  await signForm.locator('[name="days"]').fill('20');
  await signForm.locator('[name="alias"]').fill('client.example.org\nclient');
  const archive = await submitForDownload(page, 'csr-sign');
  assert.equal(archive.name, 'archive.zip');
  const certificate = memberHolding(archive.members, 'BEGIN CERTIFICATE');
  assert.ok(certificate, `members: ${archive.members.map((member) => member.name)}`);
  const signed = path.join(folder, 'client.crt');
  await writeFile(signed, certificate.content);
  const verified = await openssl('verify', '-CAfile',
    path.join(server.root, SSL, 'ssl.crt/ca.crt'), signed);
  assert.match(verified, /OK/);
  const text = await openssl('x509', '-in', signed, '-noout', '-subject', '-ext', 'subjectAltName');
  assert.match(text, /CN\s*=\s*client\.example\.org/);
  assert.match(text, /DNS:client\.example\.org, DNS:client/);
  assert.equal(await publicKeyOf(signed, 'cert'), await publicKeyOf(client.key, 'key'));

  const outcome = await formOutcome(page, 'csr-sign');
  assert.equal(outcome.tone, 'success', outcome.text);
  assert.match(outcome.text, /no longer keeps it/);
  await screenshot(page, '09-request-signed');

  // Installed, the 20-day certificate is marked as expiring soon.
  await openAction(page, 'import');
  await form(page, 'import').locator('[name="cert"]').setInputFiles(signed);
  await form(page, 'import').locator('[name="key"]').setInputFiles(client.key);
  await form(page, 'import').locator('button[type="submit"]').click();
  assert.equal((await formOutcome(page, 'import')).tone, 'success');
  await page.waitForFunction(() => document.querySelector(
    '#certificate-table tbody tr[data-role="server_cert"]')?.textContent.includes('client.example.org'),
  null, { timeout: WAIT_MS });
  const [serverRow] = await tableRows(page);
  assert.equal(serverRow.state, 'expiring');
  assert.match(serverRow.daysLeft, /^(19|20)Expires soon$/);
  await screenshot(page, '10-expiring-soon');
  assertNoConsoleErrors(consoleErrors);
});

test('renews the request of the installed certificate and exports the installed set', {
  timeout: TEST_TIMEOUT_MS,
}, async (t) => {
  const { server, page, consoleErrors } = await signedIn(t, { prepare: withLocalCa });
  const folder = await scratchFolder(t);

  await openAction(page, 'csr-renew');
  const renewed = await submitForDownload(page, 'csr-renew');
  const request = memberHolding(renewed.members, 'BEGIN CERTIFICATE REQUEST');
  assert.ok(request && memberHolding(renewed.members, 'PRIVATE KEY'));
  await writeFile(path.join(folder, 'renewed.csr'), request.content);
  assert.match(await openssl('req', '-in', path.join(folder, 'renewed.csr'), '-noout', '-subject'),
    new RegExp(`CN\\s*=\\s*${DEVICE_SERVER_NAME.replace('.', '\\.')}`));
  assert.equal((await formOutcome(page, 'csr-renew')).tone, 'success');

  await openAction(page, 'export');
  const exported = await submitForDownload(page, 'export');
  const installedCert = await readFile(path.join(server.root, SSL, 'ssl.crt/server.crt'));
  assert.ok(exported.members.some((member) => member.content.equals(installedCert)),
    'the installed server certificate is in the archive');
  assert.ok(memberHolding(exported.members, 'PRIVATE KEY'));
  const outcome = await formOutcome(page, 'export');
  assert.match(outcome.text, /holds private keys/);
  assertNoConsoleErrors(consoleErrors);
});
