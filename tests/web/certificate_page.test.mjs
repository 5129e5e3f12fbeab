// The certificate manager page in headless Debian Chromium against the real
// orva-webapi on loopback, with HTTPS on so that a new certificate restarts
// its web server: one fresh device walked through the token gate, the list
// and every form, each file it uploads one that the page downloaded before.

import assert from 'node:assert/strict';
import { mkdtemp, readFile } from 'node:fs/promises';
import path from 'node:path';
import { test } from 'node:test';

import { chromium } from 'playwright-core';

import { newDevice, run, serve } from './device.mjs';

const WAIT = { timeout: 60_000 };

// Resolves with { token, folder (scratch space), page (opened at the server),
// consoleErrors (the page's console errors and uncaught throws) } for test
// `t`. All goes away when the test ends, the browser before the server.
async function openDevice(t) {
  let browser = null;
  t.after(() => browser?.close());
  const device = await newDevice(t);
  const token = (await readFile(path.join(device.root, 'usr/orva/etc/webapi.token'), 'utf8')).trim();
  const { http } = await serve(device, process.env.ORVA_WEB_DIR);
  browser = await chromium.launch({ executablePath: '/usr/bin/chromium' });
  // The locale sets the country the forms suggest.
  const page = await browser.newPage({ viewport: { width: 1280, height: 900 }, locale: 'en-GB' });
  const consoleErrors = [];
  page.on('console', (message) => message.type() === 'error' && consoleErrors.push(message.text()));
  page.on('pageerror', (error) => consoleErrors.push(`uncaught: ${error.message}`));
  await page.goto(http);
  return { token, folder: device.folder, page, consoleErrors };
}

// Saves a full-page screenshot as NAME.png in the screenshot folder, if any.
async function screenshot(page, name) {
  const folder = process.env.ORVA_SCREENSHOTS;
  if (folder) await page.screenshot({ path: path.join(folder, `${name}.png`), fullPage: true });
}

// The table's rows as "state: the row's text" once it has loaded `count` rows.
async function tableRows(page, count) {
  const last = count ? ` tbody tr:nth-child(${count}):last-child` : '';
  await page.locator(`section[aria-busy="false"] #certificate-table${last}`)
    .waitFor({ state: 'attached', ...WAIT });
  return page.$$eval('#certificate-table tbody tr', (rows) =>
    rows.map((row) => `${row.dataset.state}: ${row.innerText.replace(/\s+/g, ' ')}`));
}

// "tone: text" of the outcome told next to the action's form (submitted
// first unless `click` is false) once the device has answered.
async function outcomeOf(page, action, click = true) {
  const form = page.locator(`form[data-action="${action}"]`);
  if (click) await form.locator('button[type="submit"]').click();
  const message = form.locator('[data-message]:is([data-tone="success"], [data-tone="error"])');
  await message.waitFor(WAIT);
  return `${await message.getAttribute('data-tone')}: ${await message.textContent()}`;
}

// Submits a form that downloads a ZIP archive and unpacks it; resolves with
// member(name), the path of the unpacked file `name`.
async function download({ page, folder }, action) {
  const [file, outcome] = await Promise.all([
    page.waitForEvent('download', WAIT), outcomeOf(page, action)]);
  assert.match(`${file.suggestedFilename()} ${outcome}`, /^archive\.zip success: /);
  const into = await mkdtemp(path.join(folder, `${action}-`));
  await run('7z', ['x', `-o${into}`, await file.path()]);
  return (member) => path.join(into, member);
}

test('walks one device through the token gate, the list and every form', { timeout: 600_000 },
  async (t) => {
    const device = await openDevice(t);
    const { page } = device;
    const field = (action, name) => page.locator(`form[data-action="${action}"] [name="${name}"]`);
    const open = (action) => page.locator(`#${action} > summary`).click();
    const signIn = (token) => page.fill('#token-input', token).then(() => page.keyboard.press('Enter'));
    assert.equal(await page.locator('#main').isVisible(), false, 'nothing before the token');
    await screenshot(page, '01-token-asked');
    await signIn('not-the-device-token');
    await page.locator('#token-reason[data-tone="error"]').waitFor(WAIT);
    await signIn('not the token');  // refused by the page itself, before any request
    await page.locator('#token-reason', { hasText: 'without spaces.' }).waitFor(WAIT);
    assert.equal(await page.locator('#main').isVisible(), false);
    await signIn(device.token);
    assert.deepEqual(await tableRows(page), []);
    await screenshot(page, '02-empty-store');
    await page.reload();
    await page.locator('#empty-store a[href="#crt-create"]').click();

    await open('csr-create');
    await field('csr-create', 'country').fill('gb');
    await field('csr-create', 'common_name').fill('files.example.co.uk');
    await field('csr-create', 'organization').fill('Files <b>&amp;</b> Co');
    await field('csr-create', 'key_length').selectOption('rsa:3072');
    const pending = await download(device, 'csr-create');
    assert.match((await run('openssl', ['req', '-in', pending('server.csr'), '-noout', '-text']))
      .stdout, /Subject: C ?= ?GB,[^]*3072 bit/);
    await screenshot(page, '03-request-downloaded');

    await field('crt-create', 'alias').fill('nas\n192.168.1.20\nfd00::20');  // the rest as suggested
    let creates = 0;
    page.on('request', (request) => { creates += /\.CRT/.test(request.postData() ?? '') ? 1 : 0; });
    const createButton = 'form[data-action="crt-create"] [type="submit"]';
    assert.deepEqual(await page.$eval(createButton, (button) => {  // the second click: busy
      button.click();
      button.click();
      return [button.getAttribute('aria-disabled'), button.textContent];
    }), ['true', 'Working…']);
    await screenshot(page, '04-creating-busy');
    assert.match(await outcomeOf(page, 'crt-create', false), /^success: /);
    assert.equal(creates, 1, 'a busy form is not sent again');
    assert.equal(await page.locator('#page-notice').isVisible(), true, 'the web server restarts');
    const [server, localCa] = await tableRows(page, 2);
    assert.match(server, /^valid: Server 127\.0\.0\.1 Local certificate authority .* 82(4|5) None$/);
    assert.match(localCa, /^valid: Local CA Local certificate authority Self-signed Local .* 36(49|50) None$/);
    await open('export');
    const exported = await download(device, 'export');

    await open('csr-sign');
    await field('csr-sign', 'csr').setInputFiles(pending('server.csr'));
    await field('csr-sign', 'days').fill('20');
    await field('csr-sign', 'alias').fill('files.example.co.uk\n1:2');
    assert.match(await outcomeOf(page, 'csr-sign'), /^error: “1:2” is not a host name/);
    assert.equal(await page.evaluate(() => document.activeElement.id), 'csr-sign-alias');
    assert.equal(await field('csr-sign', 'alias').getAttribute('aria-invalid'), 'true');
    await screenshot(page, '05-alias-refused');
    await field('csr-sign', 'alias').fill('files.example.co.uk\nfiles');
    const signed = await download(device, 'csr-sign');
    await open('csr-renew');
    const renewed = await download(device, 'csr-renew');

    await open('import');
    await field('import', 'cert').setInputFiles(signed('server.crt'));
    await field('import', 'key').setInputFiles(renewed('server.key'));
    assert.match(await outcomeOf(page, 'import'), /^error: .*\(error 5514\)$/);
    await screenshot(page, '06-mismatching-key');
    await field('import', 'key').setInputFiles(pending('server.key'));
    await field('import', 'inter_cert').setInputFiles(exported('ca.crt'));
    assert.match(await outcomeOf(page, 'import'), /^success: /);
    assert.equal(await field('import', 'cert').inputValue(), '', 'the files are cleared');
    const [imported, , intermediate] = await tableRows(page, 3);
    assert.match(imported,
      /^expiring: Server files\.example\.co\.uk Files <b>&amp;<\/b> Co Local certificate .* (19|20)Expires soon It expires /);
    assert.match(intermediate, /^valid: Intermediate Local certificate authority Self-signed/);
    await screenshot(page, '07-imported-three-rows');
    await open('export-bundle');
    await field('export-bundle', 'password').fill('bundle-pass');
    const [bundle, exportedBundle] = await Promise.all([
      page.waitForEvent('download', WAIT), outcomeOf(page, 'export-bundle')]);
    assert.match(`${bundle.suggestedFilename()} ${exportedBundle}`, /^server\.p12 success: /);
    await open('import-bundle');
    await field('import-bundle', 'bundle').setInputFiles(await bundle.path());
    await field('import-bundle', 'password').fill('bundle-pass');
    assert.match(await outcomeOf(page, 'import-bundle'), /^success: /);

    await page.locator('#forget-token').click();
    assert.equal(await page.locator('#token-gate').isVisible(), true);
    assert.equal(await page.evaluate(() => sessionStorage.length), 0, 'the token is forgotten');
    assert.deepEqual(device.consoleErrors.filter((error) => !/status of 401/.test(error)), []);
  });
