// Headless Debian Chromium with a fresh profile, closed when the test ends.
// Every page records what it writes to the console as an error.

import { mkdtemp, mkdir, rm } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';

import { chromium } from 'playwright-core';

import { atTestEnd } from './cleanup.mjs';

const CHROMIUM = '/usr/bin/chromium';
const FLAGS = ['--headless', '--no-sandbox', '--disable-gpu', '--disable-quic', '--no-first-run',
  '--disable-background-networking', '--disable-component-update', '--disable-sync'];

export const SCREENSHOT_DIR = process.env.ORVA_SCREENSHOTS || '';

// Resolves with { page, consoleErrors } for test `t`; the browser and its
// profile go away when the test ends.
export async function openBrowser(t, viewport = { width: 1280, height: 900 }) {
  const profile = await mkdtemp(path.join(os.tmpdir(), 'orva-web-profile-'));
  let context = null;
  atTestEnd(t, async () => {
    if (context !== null) await context.close();
    await rm(profile, { recursive: true, force: true });
  });
  context = await chromium.launchPersistentContext(profile, {
    executablePath: CHROMIUM,
    headless: true,
    args: FLAGS,
    viewport,
    acceptDownloads: true,
    locale: 'en-GB',
  });
  const page = context.pages()[0] ?? (await context.newPage());
  const consoleErrors = [];
  page.on('console', (message) => {
    if (message.type() === 'error') consoleErrors.push(message.text());
  });
  page.on('pageerror', (error) => consoleErrors.push(`uncaught: ${error.message}`));
  return { page, consoleErrors };
}

// Saves a full-page screenshot as NAME.png in the screenshot folder.
export async function screenshot(page, name) {
  if (SCREENSHOT_DIR === '') return;
  await mkdir(SCREENSHOT_DIR, { recursive: true });
  await page.screenshot({ path: path.join(SCREENSHOT_DIR, `${name}.png`), fullPage: true });
}
