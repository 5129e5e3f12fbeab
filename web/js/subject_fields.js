// Builds the subject fields (country, state, ... e-mail) of the forms from one
// template, and the key size choices, with their defaults.

const KEY_SIZES = [2048, 3072, 4096];
const DEFAULT_KEY_SIZE = 2048;

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

function fillKeySizes(select) {
  for (const size of KEY_SIZES) {
    const option = document.createElement('option');
    option.value = String(size);
    option.textContent = `${size} bits`;
    option.selected = size === DEFAULT_KEY_SIZE;
    select.append(option);
  }
}

// Prepares every subject fieldset and key size choice inside `root`.
export function buildSubjectFields(root, template) {
  for (const fieldset of root.querySelectorAll('fieldset[data-subject]')) {
    const form = fieldset.closest('form');
    fillSubject(fieldset, template, form.dataset.action);
  }
  root.querySelectorAll('select[data-key-sizes]').forEach(fillKeySizes);
}
