// The ACME section on the page: the settings form's dependent fields and
// credential rows, the status panel, and the form filled in from the
// device's kept settings.

import { ACME_API, acmeFormValues, acmeStatusLines } from './acme.js';
import { describeError } from './messages.js';

// Shows the fields marked data-shown-for="VALUE" only while a select of
// the form has that value; the ones shown that need a value get
// `required`.
function showDependentFields(form) {
  const chosen = new Set([form.elements.directory.value, form.elements.challenge.value]);
  for (const field of form.querySelectorAll('[data-shown-for]')) {
    field.hidden = !chosen.has(field.dataset.shownFor);
  }
  form.elements.custom_directory.required = chosen.has('custom');
  form.elements.dns_provider.required = chosen.has('dns-01');
}

function addCredentialRow(form, template, name = '') {
  const row = template.content.firstElementChild.cloneNode(true);
  row.querySelector('[name="credential_name"]').value = name;
  if (name !== '') {
    row.querySelector('[name="credential_value"]').placeholder = 'Kept on the device: type it again';
  }
  row.querySelector('[data-remove-credential]').addEventListener('click', () => row.remove());
  form.querySelector('[data-add-credential]').before(row);
}

// Prepares the section's settings form; `template` makes one credential row.
export function bindAcmeSection(section, template) {
  const form = section.querySelector('form[data-action="acme-set"]');
  form.addEventListener('change', () => showDependentFields(form));
  form.querySelector('[data-add-credential]')
    .addEventListener('click', () => addCredentialRow(form, template));
  addCredentialRow(form, template);
  showDependentFields(form);
}

function showStatus(section, lines) {
  for (const element of section.querySelectorAll('[data-line]')) {
    const line = lines[element.dataset.line] ?? '';
    element.textContent = line;
    element.hidden = line === '';
    if (element.previousElementSibling?.tagName === 'DT') {
      element.previousElementSibling.hidden = line === '';
    }
  }
}

// Fills the settings form with the kept `settings`, unless the user has
// already typed into it.
function fillForm(section, template, settings) {
  const form = section.querySelector('form[data-action="acme-set"]');
  const values = acmeFormValues(settings);
  if (values === null || form.dataset.filled === 'true' || form.elements.domains.value !== '') {
    return;
  }
  form.dataset.filled = 'true';
  for (const name of ['domains', 'email', 'directory', 'custom_directory', 'challenge',
    'dns_provider', 'key_type', 'renew_days']) {
    form.elements[name].value = values[name];
  }
  form.querySelectorAll('.credential-row').forEach((row) => row.remove());
  values.credentials.forEach((name) => addCredentialRow(form, template, name));
  if (values.credentials.length === 0) addCredentialRow(form, template);
  showDependentFields(form);
}

// Reads the device's ACME settings and status ("get") and shows them; a
// failure is told in the panel.
export async function refreshAcmeSection(api, section, template) {
  const panel = section.querySelector('#acme-status');
  panel.setAttribute('aria-busy', 'true');
  try {
    const data = await api.call(ACME_API, 'get');
    showStatus(panel, acmeStatusLines(data));
    fillForm(section, template, data?.settings ?? null);
  } catch (error) {
    showStatus(panel, { setup: describeError(error, 'acme-get') });
  } finally {
    panel.setAttribute('aria-busy', 'false');
  }
}
