// Devices made by the real orva-webapi ($ORVA_WEBAPI) in fresh folders and
// served on loopback with HTTPS on, for the tests that point a browser or
// real TLS clients at them.

import { execFile, spawn } from 'node:child_process';
import { once } from 'node:events';
import { chmod, mkdtemp, rm } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';
import { createInterface } from 'node:readline';
import { promisify } from 'node:util';

export { chromium } from 'playwright-core';

export const run = promisify(execFile);

// A device root made by init in a new folder for test `t`, in a folder
// whose name holds a quote and nginx's variable sign. When the test ends,
// the servers started on it stop, then the folder goes. Resolves with
// { root, folder, servers }.
export async function newDevice(t) {
  const folder = await mkdtemp(path.join(os.tmpdir(), 'orva-device-'));
  await chmod(folder, 0o755);  // nginx's workers run as nobody when the tests run as root
  const device = { root: path.join(folder, "it's $device"), folder, servers: [] };
  t.after(async () => {
    for (const server of device.servers) {
      if (server.exitCode !== null || server.signalCode !== null) continue;
      server.kill('SIGTERM');
      await once(server, 'exit');
    }
    await rm(folder, { recursive: true, force: true });
  });
  await run(process.env.ORVA_WEBAPI, ['init', '--root', device.root]);
  return device;
}

// Serves `device` with HTTPS on, and `web` as its page folder when given.
// Resolves with { http, https }, the URLs it printed, once it is up.
export async function serve(device, web) {
  await run('sed', ['-i', 's/runHTTPS="no"/runHTTPS="yes"/',
    path.join(device.root, 'usr/orva/etc/orva.conf')]);
  const server = spawn(process.env.ORVA_WEBAPI, ['serve', '--root', device.root, '--listen',
    '127.0.0.1:0', '--listen-https', '127.0.0.1:0', ...(web ? ['--web', web] : [])],
  { stdio: ['ignore', 'pipe', 'inherit'] });
  device.servers.push(server);
  const urls = {};
  for await (const line of createInterface({ input: server.stdout })) {
    const [, scheme, url] = /^(https?): +(\S+)$/.exec(line) ?? [];
    if (scheme) urls[scheme] = url;
    if (line.startsWith('token: ')) return urls;  // the last line once both listeners are up
  }
  throw new Error('orva-webapi serve ended before it listened');
}
