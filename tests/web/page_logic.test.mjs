// The page's date and name handling, without a browser: the texts the device
// prints for certificate times, the expiry marks, and the alias lists.

import assert from 'node:assert/strict';
import { readFile } from 'node:fs/promises';
import { test } from 'node:test';

// The page's scripts are browser modules in a folder without a package.json;
// Node 18 would load them as CommonJS, so they are imported as module text.
// Both modules import nothing themselves.
async function pageModule(name) {
  const source = await readFile(new URL(`../../web/js/${name}`, import.meta.url));
  return import(`data:text/javascript;base64,${source.toString('base64')}`);
}

const { aliasProblem, joinAliases, parseAliases } = await pageModule('aliases.js');
const {
  daysLeft, formatCertificateTime, parseCertificateTime, validityState,
} = await pageModule('cert_time.js');

test('reads the validity times the device prints and nothing else', () => {
  const cases = [
    ['Dec  6 12:23:45 2035 GMT', '2035-12-06T12:23:45.000Z'],
    ['Feb 29 23:59:59 2028 GMT', '2028-02-29T23:59:59.000Z'],
    ['Mar 10 08:05:01.250 2049 GMT', '2049-03-10T08:05:01.000Z'],
    ['Jun  1 10:00:00 2030', '2030-06-01T10:00:00.000Z'],
    ...['', null, 'Dec 6 2035', 'Foo  6 12:23:45 2035 GMT', 'Feb 30 12:00:00 2027 GMT',
      'Dec 32 12:00:00 2027 GMT', 'Dec  6 24:00:00 2035 GMT', '2035-12-06T12:23:45Z']
      .map((text) => [text, null]),
  ];
  for (const [text, expected] of cases) {
    assert.equal(parseCertificateTime(text)?.toISOString() ?? null, expected, String(text));
  }
  assert.equal(formatCertificateTime(parseCertificateTime('Dec  6 09:03:45 2035 GMT')),
    '2035-12-06 09:03\u00a0UTC');
});

test('counts whole days left and marks expired, expiring and not yet valid certificates', () => {
  const now = new Date('2030-01-01T12:00:00Z');
  const cases = [  // valid from, valid until, days left, mark
    ['2029-01-01T00:00:00Z', '2030-01-01T11:59:59Z', -1, 'expired'],
    ['2029-01-01T00:00:00Z', '2030-01-01T12:00:00Z', 0, 'expired'],
    ['2029-01-01T00:00:00Z', '2030-01-01T18:00:00Z', 0, 'expiring'],
    ['2029-01-01T00:00:00Z', '2030-01-31T12:00:01Z', 30, 'expiring'],
    ['2029-01-01T00:00:00Z', '2030-02-01T12:00:00Z', 31, 'valid'],
    ['2030-02-01T00:00:00Z', '2031-01-01T00:00:00Z', 364, 'not-yet-valid'],
    ['2031-01-01T00:00:00Z', '2029-01-01T00:00:00Z', -366, 'expired'],
  ];
  for (const [from, until, days, mark] of cases) {
    assert.equal(daysLeft(new Date(until), now), days, until);
    assert.equal(validityState(new Date(from), new Date(until), now), mark, `${from} to ${until}`);
  }
  assert.equal(validityState(null, null, now), 'unknown');
});

test('takes alias lists typed one a line or separated, and names those the device refuses', () => {
  const cases = [  // typed, as the device takes it, refused names
    ['', '', []],
    ['nas.example.com\n\n*.example.com\r\n', 'nas.example.com;*.example.com', []],
    [' a.example , b.example;c.example  d_e ', 'a.example;b.example;c.example;d_e', []],
    ['192.168.1.10\nfd00::1', '192.168.1.10;fd00::1', []],
    ['same\nsame\nother', 'same;other', []],
    ['good.example\nbad/name', 'good.example;bad/name', ['bad/name']],
    ["it's quote\"d", "it's;quote\"d", ["it's", 'quote"d']],
    ['näs.example a:b:c:zz', 'näs.example;a:b:c:zz', ['näs.example', 'a:b:c:zz']],
    ['a'.repeat(254), 'a'.repeat(254), ['a'.repeat(254)]],
  ];
  for (const [text, joined, refused] of cases) {
    assert.equal(joinAliases(text), joined, JSON.stringify(text));
    assert.deepEqual(parseAliases(text).refused, refused, JSON.stringify(text));
    assert.equal(aliasProblem(text) === '', refused.length === 0, JSON.stringify(text));
  }
  assert.match(aliasProblem('good bad/name worse/name'),
    /^“bad\/name” is not a host name or IP address/);
  const many = Array.from({ length: 101 }, (_, index) => `n${index}`).join('\n');
  assert.equal(aliasProblem(many), 'Enter at most 100 names.');
});
