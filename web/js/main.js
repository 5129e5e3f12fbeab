// Starts the page: asks for the access token when none is kept, shows the
// installed certificates and binds the action forms.

import { bindAcmeSection, refreshAcmeSection } from './acme_section.js';
import { bindActionForm } from './action_form.js';
import { BUSY_TEXTS, actionRuns } from './actions.js';
import { renderCertificates } from './cert_table.js';
import { loadInstalledCertificates } from './certificate_list.js';
import { describeError } from './messages.js';
import { showMessage } from './show_message.js';
import { bindServerDaysNote } from './server_days.js';
import { buildSubjectFields } from './subject_fields.js';
import { TokenGate } from './token_gate.js';
import { WebApi } from './webapi.js';

const RESTART_RETRY_DELAY_MS = 2000;
const RESTART_RETRIES = 5;

const byId = (id) => document.getElementById(id);
const sleep = (ms) => new Promise((resolve) => { setTimeout(resolve, ms); });

const tokens = new TokenGate({
  gate: byId('token-gate'),
  form: byId('token-form'),
  input: byId('token-input'),
  reason: byId('token-reason'),
  app: byId('main'),
  forgetButton: byId('forget-token'),
});
const api = new WebApi(tokens);

const table = byId('certificate-table');
const tableSection = table.closest('section');
const tableMessage = byId('table-message');
const emptyStore = byId('empty-store');
const pageNotice = byId('page-notice');

// Shows the installed certificates. `retries`: how often to try again when
// the device does not answer (its web server may be restarting).
async function refreshTable(retries = 0) {
  tableSection.setAttribute('aria-busy', 'true');
  showMessage(tableMessage, 'Reading the installed certificates…', 'busy');
  try {
    for (let attempt = 0; ; attempt += 1) {
      try {
        const entries = await loadInstalledCertificates(api);
        renderCertificates(table, entries);
        table.hidden = entries.length === 0;
        emptyStore.hidden = entries.length !== 0;
        showMessage(tableMessage, '');
        return;
      } catch (error) {
        if (error?.kind !== 'network' || attempt >= retries) throw error;
        await sleep(RESTART_RETRY_DELAY_MS);
      }
    }
  } catch (error) {
    showMessage(tableMessage, describeError(error, 'list'), 'error');
  } finally {
    tableSection.setAttribute('aria-busy', 'false');
  }
}

// Called after a new certificate is installed: tells what restarted and
// shows the new table. Returns the sentence for the form.
function installed(data) {
  pageNotice.hidden = true;
  if (data?.restart_httpd === true && data.web_certificate === 'previous') {
    pageNotice.textContent = 'The management web server did not take the new certificate: it ' +
      'could not load it, and keeps presenting the previous one. Its key must be at least ' +
      '2048 bits (RSA) or 256 bits (EC).';
    pageNotice.hidden = false;
    refreshTable();
    return 'The device’s secure services restarted with it; the management web server did not ' +
      'take it.';
  }
  if (data?.restart_httpd === true) {
    pageNotice.textContent = 'The management web server is restarting with the new ' +
      'certificate. If the page stops answering, wait a moment and reload it; the browser ' +
      'may ask you to trust the new certificate.';
    pageNotice.hidden = false;
    sleep(RESTART_RETRY_DELAY_MS).then(() => refreshTable(RESTART_RETRIES));
    return 'The device’s secure services restarted with it, and the management web server ' +
      'is restarting with it too.';
  }
  refreshTable();
  return 'The device’s secure services restarted with it.';
}

buildSubjectFields(document, byId('subject-fields'));
bindServerDaysNote(byId('csr-sign-days'), byId('csr-sign-days-note'));

const acmeSection = byId('acme');
const acmeCredential = byId('acme-credential');
bindAcmeSection(acmeSection, acmeCredential);
const refreshAcme = () => refreshAcmeSection(api, acmeSection, acmeCredential);

const runs = actionRuns(api, installed, refreshAcme);
for (const form of document.querySelectorAll('form[data-action]')) {
  const action = form.dataset.action;
  bindActionForm(form, runs[action], BUSY_TEXTS[action]);
}

for (const link of document.querySelectorAll('[data-open-action]')) {
  link.addEventListener('click', (event) => {
    event.preventDefault();
    const details = byId(link.dataset.openAction);
    details.open = true;
    details.querySelector('summary').focus();
    details.scrollIntoView({ block: 'start' });
  });
}

byId('refresh-table').addEventListener('click', () => refreshTable());
byId('forget-token').addEventListener('click', () => tokens.forget().then(() => {
  refreshTable();
  refreshAcme();
}));

refreshTable();
refreshAcme();
