// Builds the subject fields (country, state, ... e-mail) of the forms from one
// template, and the key choices, with their defaults.

// "TYPE:BITS" as the forms send it; a P-256 key is made at once and every
// current client takes it, where an RSA key takes seconds.
const KEY_CHOICES = [
  ['ec:256', 'EC P-256 (recommended)'],
  ['ec:384', 'EC P-384'],
  ['rsa:2048', 'RSA 2048 bits'],
  ['rsa:3072', 'RSA 3072 bits'],
  ['rsa:4096', 'RSA 4096 bits'],
];
const DEFAULT_KEY_CHOICE = 'ec:256';

const CA_DEFAULT_COMMON_NAME = 'Local certificate authority';

// The region of the browser's language ("en-GB" gives "GB"), or ''.
function defaultCountry() {
  const region = /^[a-z]{2,3}-([A-Z]{2})\b/i.exec(navigator.language || '');
  return region ? region[1].toUpperCase() : '';
}

// Fills one fieldset marked data-subject="server" or "ca". The device names
// the authority's fields with the prefix "ca_".
function fillSubject(fieldset, template, formId) {
  const kind = fieldset.dataset.subject;
  const prefix = kind === 'ca' ? 'ca_' : '';
  fieldset.append(template.content.cloneNode(true));

  for (const input of fieldset.querySelectorAll('[data-name]')) {
    const name = prefix + input.dataset.name;
    input.name = name;
    input.id = `${formId}-${name}`;
    input.removeAttribute('data-name');
  }
  for (const label of fieldset.querySelectorAll('label[data-for]')) {
    label.htmlFor = `${formId}-${prefix}${label.dataset.for}`;
    label.removeAttribute('data-for');
  }

  fieldset.querySelector(`[name="${prefix}country"]`).value = defaultCountry();
  const commonName = fieldset.querySelector(`[name="${prefix}common_name"]`);
  if (kind === 'ca') {
    commonName.value = CA_DEFAULT_COMMON_NAME;
  } else {
    commonName.value = location.hostname;
    const hint = document.createElement('p');
    hint.className = 'hint';
    hint.id = `${commonName.id}-hint`;
    hint.textContent = 'The name browsers use to reach the device, for example nas.example.com.';
    commonName.after(hint);
    commonName.setAttribute('aria-describedby', hint.id);
  }
}

function fillKeyChoices(select) {
  for (const [value, label] of KEY_CHOICES) {
    const option = document.createElement('option');
    option.value = value;
    option.textContent = label;
    option.selected = value === DEFAULT_KEY_CHOICE;
    select.append(option);
  }
}

// Prepares every subject fieldset and key choice inside `root`.
export function buildSubjectFields(root, template) {
  for (const fieldset of root.querySelectorAll('fieldset[data-subject]')) {
    const form = fieldset.closest('form');
    fillSubject(fieldset, template, form.dataset.action);
  }
  root.querySelectorAll('select[data-key-choices]').forEach(fillKeyChoices);
}
