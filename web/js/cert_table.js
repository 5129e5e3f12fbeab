// Fills the table of installed certificates. Every text from a certificate
// goes in as text, never as markup: names come from uploaded files.

import {
  daysLeft, formatCertificateTime, parseCertificateTime, validityState, wholeDaysBetween,
} from './cert_time.js';
import { compatibilityWarnings } from './compatibility.js';

const ROLE_NAMES = {
  server_cert: 'Server',
  root_cert: 'Local CA',
  inter_cert: 'Intermediate',
};

function element(tag, text = '', className = '') {
  const node = document.createElement(tag);
  if (text !== '') node.textContent = text;
  if (className !== '') node.className = className;
  return node;
}

// Common name first, organization below it.
function nameCell(name, issuerOfItself) {
  const cell = element('td');
  if (name === null || typeof name !== 'object') {
    cell.append(element('span', 'No name', 'muted'));
    return cell;
  }
  cell.append(element('span', name.common_name || name.organization || 'No common name',
    'name-main'));
  if (name.common_name && name.organization) {
    cell.append(element('span', name.organization, 'name-detail'));
  }
  if (issuerOfItself) cell.append(element('span', 'Self-signed', 'name-detail'));
  return cell;
}

function timeCell(text) {
  const cell = element('td');
  const date = parseCertificateTime(text);
  if (date === null) {
    cell.textContent = text || 'Unknown';
    return cell;
  }
  const time = element('time', formatCertificateTime(date));
  time.dateTime = date.toISOString();
  time.title = text;
  cell.append(time);
  return cell;
}

function daysLeftCell(state, days, ago) {
  const cell = element('td', '', 'days-left');
  if (state === 'unknown') {
    cell.textContent = 'Unknown';
    return cell;
  }
  if (state === 'expired') {
    cell.append(element('span', 'Expired', 'badge badge-expired'));
    const when = ago === 0 ? 'today' : ago === 1 ? '1 day ago' : `${ago} days ago`;
    cell.append(element('span', ` ${when}`, 'days-detail'));
    return cell;
  }
  cell.append(element('span', String(days), 'days-number'));
  if (state === 'expiring') cell.append(element('span', 'Expires soon', 'badge badge-expiring'));
  if (state === 'not-yet-valid') cell.append(element('span', 'Not yet valid', 'badge badge-expiring'));
  return cell;
}

// The clients that refuse the certificate, and why; "None" when none does.
function warningsCell(compatibility) {
  const cell = element('td', '', 'warnings');
  const warnings = compatibilityWarnings(compatibility);
  if (warnings.length === 0) {
    cell.append(element('span', 'None', 'muted'));
    return cell;
  }
  const list = element('ul');
  list.append(...warnings.map((warning) => element('li', warning)));
  cell.append(list);
  return cell;
}

function sameName(first, second) {
  return first !== null && JSON.stringify(first) === JSON.stringify(second);
}

function row(entry, now, columnNames) {
  const from = parseCertificateTime(entry.valid_from);
  const until = parseCertificateTime(entry.valid_till);
  const state = validityState(from, until, now);
  const days = until === null ? 0 : daysLeft(until, now);
  const daysAgo = until === null ? 0 : wholeDaysBetween(until, now);

  const tr = element('tr');
  tr.dataset.role = entry.type || '';
  tr.dataset.state = state;
  tr.append(element('td', ROLE_NAMES[entry.type] || 'Other', 'role'));
  tr.append(nameCell(entry.subject ?? null, sameName(entry.subject ?? null, entry.issuer ?? null)));
  tr.append(nameCell(entry.issuer ?? null, false));
  tr.append(element('td', entry.signature_algorithm || 'Unknown', 'algorithm'));
  tr.append(timeCell(entry.valid_from));
  tr.append(timeCell(entry.valid_till));
  tr.append(daysLeftCell(state, days, daysAgo));
  tr.append(warningsCell(entry.compatibility));
  // The column name of each cell, shown beside the value on narrow screens.
  [...tr.cells].forEach((cell, index) => { cell.dataset.label = columnNames[index]; });
  return tr;
}

// Replaces the rows of `table`'s body with one row per certificate entry,
// in the order of the columns its head names.
export function renderCertificates(table, entries, now = new Date()) {
  const columnNames = [...table.tHead.rows[0].cells].map((cell) => cell.textContent);
  table.tBodies[0].replaceChildren(...entries.map((entry) => row(entry, now, columnNames)));
}
