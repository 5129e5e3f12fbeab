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

const at = (text) => new Date(text);

test('parses the validity times the device prints', () => {
  const cases = [
    ['Dec  6 12:23:45 2035 GMT', '2035-12-06T12:23:45.000Z'],
    ['Jan 31 00:00:00 2026 GMT', '2026-01-31T00:00:00.000Z'],
    ['Feb 29 23:59:59 2028 GMT', '2028-02-29T23:59:59.000Z'],
    ['Mar 10 08:05:01.250 2049 GMT', '2049-03-10T08:05:01.000Z'],
    ['Jun  1 10:00:00 2030', '2030-06-01T10:00:00.000Z'],
  ];
  for (const [text, expected] of cases) {
    assert.equal(parseCertificateTime(text)?.toISOString(), expected, text);
  }
});

test('refuses texts that are no certificate time', () => {
  const cases = ['', null, undefined, 'Dec 6 2035', 'Foo  6 12:23:45 2035 GMT',
    'Feb 30 12:00:00 2027 GMT', 'Dec 32 12:00:00 2027 GMT', 'Dec  6 24:00:00 2035 GMT',
    '2035-12-06T12:23:45Z'];
  for (const text of cases) {
    assert.equal(parseCertificateTime(text), null, String(text));
  }
});

test('counts whole days left and marks expired and expiring certificates', () => {
  const now = at('2030-01-01T12:00:00Z');
  const from = at('2029-01-01T00:00:00Z');
  const cases = [
    ['2030-01-01T11:59:59Z', -1, 'expired'],
    ['2030-01-01T12:00:00Z', 0, 'expired'],
    ['2030-01-01T18:00:00Z', 0, 'expiring'],
    ['2030-01-31T12:00:00Z', 30, 'expiring'],
    ['2030-01-31T12:00:01Z', 30, 'expiring'],
    ['2030-02-01T12:00:00Z', 31, 'valid'],
    ['2040-01-01T12:00:00Z', 3652, 'valid'],
  ];
  for (const [until, days, state] of cases) {
    assert.equal(daysLeft(at(until), now), days, until);
    assert.equal(validityState(from, at(until), now), state, until);
  }
});

test('marks a certificate whose validity has not begun, and one without an end', () => {
  const now = at('2030-01-01T12:00:00Z');
  assert.equal(validityState(at('2030-02-01T00:00:00Z'), at('2031-01-01T00:00:00Z'), now),
    'not-yet-valid');
  assert.equal(validityState(at('2031-01-01T00:00:00Z'), at('2029-01-01T00:00:00Z'), now),
    'expired', 'an ended certificate is expired whatever its start');
  assert.equal(validityState(null, null, now), 'unknown');
});

test('shows times in one unambiguous form', () => {
  assert.equal(formatCertificateTime(at('2035-12-06T09:03:45Z')), '2035-12-06 09:03\u00a0UTC');
});

test('takes alias lists typed one a line, or separated by commas and semicolons', () => {
  const cases = [
    ['', ''],
    ['nas.example.com', 'nas.example.com'],
    ['nas.example.com\n\n*.example.com\r\n', 'nas.example.com;*.example.com'],
    [' a.example , b.example;c.example  d_e ', 'a.example;b.example;c.example;d_e'],
    ['192.168.1.10\nfd00::1', '192.168.1.10;fd00::1'],
    ['same\nsame\nother', 'same;other'],
  ];
  for (const [text, joined] of cases) {
    assert.equal(joinAliases(text), joined, JSON.stringify(text));
    assert.equal(aliasProblem(text), '', JSON.stringify(text));
  }
});

test('names the first alias the device would refuse', () => {
  const cases = [
    ['good.example\nbad/name', 'bad/name'],
    ["it's", "it's"],
    ['quote"d', 'quote"d'],
    ['näs.example', 'näs.example'],
    ['a:b:c:zz', 'a:b:c:zz'],
    [`${'a'.repeat(254)}`, 'a'.repeat(254)],
  ];
  for (const [text, refused] of cases) {
    assert.deepEqual(parseAliases(text).refused, [refused], JSON.stringify(text));
    assert.match(aliasProblem(text), /is not a host name or IP address/);
  }
  const many = Array.from({ length: 101 }, (_, index) => `n${index}`).join('\n');
  assert.match(aliasProblem(many), /at most 100 names/);
});
