// The ACME section in headless Debian Chromium against the real orva-webapi
// and pebble on loopback (its DNS answers 127.0.0.1 for every name): the form
// gets a certificate by http-01 through the device's own HTTP listener, the
// status panel tells it, "Renew now" orders again, and a gone authority is
// told in words.

import assert from 'node:assert/strict';
import { spawn } from 'node:child_process';
import { once } from 'node:events';
import { open, readFile, writeFile } from 'node:fs/promises';
import net from 'node:net';
import path from 'node:path';
import { test } from 'node:test';

import { chromium, newDevice, run, serve } from './device.mjs';

const WAIT = { timeout: 120_000 };

// `count` different free loopback ports.
async function freePorts(count) {
  const servers = Array.from({ length: count }, () => net.createServer().listen(0, '127.0.0.1'));
  await Promise.all(servers.map((server) => once(server, 'listening')));
  const ports = servers.map((server) => server.address().port);
  for (const server of servers) server.close();
  return ports;
}

// Resolves once something accepts connections on 127.0.0.1:`port`; rejects
// after 10 s.
async function listening(port) {
  for (const deadline = Date.now() + 10_000; ; await new Promise((go) => { setTimeout(go, 50); })) {
    const socket = net.connect(port, '127.0.0.1');
    const connected = await once(socket, 'connect').then(() => true, () => false);
    socket.destroy();
    if (connected) return;
    if (Date.now() > deadline) throw new Error(`nothing listens on port ${port}`);
  }
}

// Starts `command` with `env` added, its output in the file `log`; it stops
// with `device`'s servers.
async function launch(device, command, args, log, env = {}) {
  const output = await open(log, 'w');
  const child = spawn(command, args, { env: { ...process.env, ...env },
    stdio: ['ignore', output.fd, output.fd] });
  await output.close();
  device.servers.push(child);
  return child;
}

// "tone: text" of the outcome told next to `form` once the device answers.
async function outcomeOf(form) {
  await form.locator('button[type="submit"]').click();
  const message = form.locator('[data-message]:is([data-tone="success"], [data-tone="error"])');
  await message.waitFor(WAIT);
  return `${await message.getAttribute('data-tone')}: ${await message.textContent()}`;
}

test('gets a certificate from an ACME authority, shows its status and renews it',
  { timeout: 600_000 }, async (t) => {
    const device = await newDevice(t);
    const file = (name) => path.join(device.folder, name);
    await run('openssl', ['req', '-x509', '-newkey', 'ec', '-pkeyopt', 'ec_paramgen_curve:P-256',
      '-nodes', '-days', '2', '-subj', '/CN=pebble', '-addext', 'subjectAltName=IP:127.0.0.1',
      '-keyout', file('pebble.key'), '-out', file('pebble.crt')]);
    const token = (await readFile(path.join(device.root, 'usr/orva/etc/webapi.token'), 'utf8')).trim();
    process.env.LEGO_CA_CERTIFICATES = file('pebble.crt');  // for lego, which serve runs
    const url = (await serve(device, process.env.ORVA_WEB_DIR)).http;

    const [acme, management, dns, dnsManagement, tls] = await freePorts(5);
    await launch(device, '/usr/bin/pebble-challtestsrv', ['-management', `127.0.0.1:${dnsManagement}`,
      '-dns01', `127.0.0.1:${dns}`, '-defaultIPv4', '127.0.0.1', '-defaultIPv6', '',
      '-http01', '', '-https01', '', '-tlsalpn01', ''], file('challtestsrv.log'));
    await writeFile(file('pebble.json'), JSON.stringify({ pebble: {
      listenAddress: `127.0.0.1:${acme}`, managementListenAddress: `127.0.0.1:${management}`,
      certificate: file('pebble.crt'), privateKey: file('pebble.key'),
      httpPort: Number(new URL(url).port), tlsPort: tls, ocspResponderURL: '',
      externalAccountBindingRequired: false } }));
    const pebble = await launch(device, '/usr/bin/pebble', ['-config', file('pebble.json'),
      '-dnsserver', `127.0.0.1:${dns}`], file('pebble.log'), { PEBBLE_VA_NOSLEEP: '1' });
    await Promise.all([acme, dnsManagement].map(listening));

    const browser = await chromium.launch({ executablePath: '/usr/bin/chromium' });
    t.after(() => browser.close());
    const page = await browser.newPage({ viewport: { width: 1280, height: 1000 } });
    const consoleErrors = [];
    page.on('pageerror', (error) => consoleErrors.push(`uncaught: ${error.message}`));
    await page.goto(url);
    await page.fill('#token-input', token);
    await page.keyboard.press('Enter');
    const line = (name) => page.locator(`#acme-status [data-line="${name}"]`);
    const panel = async () => {
      await page.locator('#acme-status[aria-busy="false"]').waitFor(WAIT);
      return page.locator('#acme-status').innerText();
    };
    assert.match(await panel(), /Not set up: fill in the form below/);

    await page.locator('#acme > details > summary').click();
    const settings = page.locator('form[data-action="acme-set"]');
    await page.fill('#acme-domains', 'nas.acme.test');
    await page.fill('#acme-email', 'admin@acme.test');
    await page.selectOption('#acme-directory', 'custom');
    await page.fill('#acme-custom_directory', `https://127.0.0.1:${acme}/dir`);
    assert.match(await outcomeOf(settings), /^error: Tick “I agree to the authority’s terms/);
    await page.check('#acme-agree_tos');
    assert.match(await outcomeOf(settings),
      /^success: The certificate is issued and installed\. The device’s secure services/);
    await line('issuer').filter({ hasText: 'Pebble Intermediate' }).waitFor(WAIT);
    assert.match(await panel(), new RegExp('For nas\\.acme\\.test, from https://127\\.0\\.0\\.1:' +
      `${acme}/dir\\.[^]*Result\\s+The certificate was issued and installed\\.[^]*` +
      'Valid until\\s+\\d{4}-\\d\\d-\\d\\d \\d\\d:\\d\\d\\sUTC \\(\\d+ days left\\)\\s+' +
      'Next renewal\\s+\\d{4}-\\d\\d-\\d\\d'));

    const renewNow = page.locator('form[data-action="acme-issue"]');
    assert.match(await outcomeOf(renewNow), /^success: The certificate is issued and installed\./);

    pebble.kill('SIGKILL');
    await once(pebble, 'exit');
    assert.match(await outcomeOf(renewNow), new RegExp('^error: The ACME authority did not issue ' +
      'the certificate\\. The installed certificates are unchanged\\. Reason given: “.+”\\. ' +
      '\\(error 5523\\)$'));
    await line('result').filter({ hasText: 'It failed' }).waitFor(WAIT);
    assert.deepEqual(consoleErrors, []);
  });
