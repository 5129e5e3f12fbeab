// What each action form asks the device to do, and what it tells afterwards.

import { ACME_API, acmeSettingsParams } from './acme.js';
import { joinAliases } from './aliases.js';
import { StepFailure } from './action_form.js';
import { saveFile } from './save_file.js';

const SUBJECT_FIELDS = ['country', 'state', 'city', 'organization', 'department',
  'common_name', 'email'];

function text(values, name) {
  const value = values.get(name);
  return typeof value === 'string' ? value.trim() : '';
}

// The subject parameters, named with `prefix` ("ca_" for the authority).
function subject(values, prefix = '') {
  const params = {};
  for (const field of SUBJECT_FIELDS) params[prefix + field] = text(values, prefix + field);
  params[`${prefix}country`] = params[`${prefix}country`].toUpperCase();
  return params;
}

// The key chosen as "TYPE:BITS" in the select `${prefix}key_length`, as the
// device's parameters key_type and key_length named with `prefix`.
function keyChoice(values, prefix = '') {
  const [type, bits] = text(values, `${prefix}key_length`).split(':');
  return { [`${prefix}key_type`]: type, [`${prefix}key_length`]: bits ?? '' };
}

// A chosen file, or null when the file input was left empty.
function chosenFile(values, name) {
  const file = values.get(name);
  return file instanceof File && file.name !== '' ? file : null;
}

// Sends the form's file inputs back to "nothing chosen" after a success, so
// that the same files are not sent again by mistake.
function clearFiles(form) {
  form.querySelectorAll('input[type="file"]').forEach((input) => { input.value = ''; });
}

// `api`: the WebApi; `installed(data)`: called after a new certificate is
// installed with the answer's data ({ restart_httpd }), returns the sentence
// to add; `acmeChanged()`: called after every ACME order, whatever its
// outcome. Returns the run functions of the forms, by data-action.
export function actionRuns(api, installed, acmeChanged) {
  async function downloadNow(set, context, lead) {
    return downloadFrom('ORVA.Core.Certificate', 'export', { file: set }, context, lead);
  }

  async function downloadFrom(apiName, method, params, context, lead) {
    let file;
    try {
      file = await api.download(apiName, method, params);
    } catch (error) {
      throw new StepFailure(error, context, lead);
    }
    saveFile(file.blob, file.fileName);
    return file.fileName;
  }

  async function pendingSetDownloaded(made) {
    const fileName = await downloadNow('csr_set', 'download-pending',
      `The request was ${made}, but its download failed.`);
    return {
      text: `The request and its new key were downloaded as ${fileName}. ` +
        'The device no longer keeps them: this file holds the only copy of the new key.',
    };
  }

  // Orders a certificate from the ACME authority now; `lead` goes before the
  // sentence of a failure.
  async function acmeIssued(lead) {
    try {
      const data = await api.call(ACME_API, 'issue');
      return { text: `The certificate is issued and installed. ${installed(data)}` };
    } catch (error) {
      throw lead ? new StepFailure(error, 'acme-issue', lead) : error;
    } finally {
      acmeChanged();
    }
  }

  return {
    'acme-set': async (values) => {
      await api.call(ACME_API, 'set', acmeSettingsParams(values));
      return acmeIssued('The settings are saved, but no certificate was issued.');
    },

    'acme-issue': async () => acmeIssued(''),

    'crt-create': async (values) => {
      const params = {
        ...subject(values),
        ...subject(values, 'ca_'),
        ...keyChoice(values),
        ...keyChoice(values, 'ca_'),
        alias: joinAliases(text(values, 'alias')),
      };
      const data = await api.call('ORVA.Core.Certificate.CRT', 'create', params);
      return {
        text: 'The new local certificate authority and server certificate are installed. ' +
          installed(data),
      };
    },

    'csr-create': async (values) => {
      await api.call('ORVA.Core.Certificate.CSR', 'create', {
        ...subject(values),
        ...keyChoice(values),
      });
      return pendingSetDownloaded('made');
    },

    'csr-renew': async () => {
      await api.call('ORVA.Core.Certificate.CSR', 'renew');
      return pendingSetDownloaded('renewed');
    },

    import: async (values, form) => {
      const files = { cert: chosenFile(values, 'cert'), key: chosenFile(values, 'key') };
      const intermediate = chosenFile(values, 'inter_cert');
      if (intermediate !== null) files.inter_cert = intermediate;
      const data = await api.call('ORVA.Core.Certificate', 'import', {}, files);
      clearFiles(form);
      return { text: `The certificate is installed. ${installed(data)}` };
    },

    'import-bundle': async (values, form) => {
      const data = await api.call('ORVA.Core.Certificate.Bundle', 'import',
        { password: values.get('password') ?? '' }, { bundle: chosenFile(values, 'bundle') });
      clearFiles(form);
      form.querySelector('[name="password"]').value = '';
      return { text: `The certificate is installed. ${installed(data)}` };
    },

    'csr-sign': async (values, form) => {
      await api.call('ORVA.Core.Certificate.CSR', 'sign', {
        days: text(values, 'days'),
        alias: joinAliases(text(values, 'alias')),
      }, { csr: chosenFile(values, 'csr') });
      clearFiles(form);
      const fileName = await downloadNow('signed_set', 'download-signed',
        'The request was signed, but the certificate’s download failed.');
      return {
        text: `The signed certificate was downloaded as ${fileName}. ` +
          'The device no longer keeps it.',
      };
    },

    export: async () => {
      const fileName = await downloadNow('archive', 'download-installed',
        'The download failed.');
      return { text: `The installed set was downloaded as ${fileName}. It holds private keys: keep it safe.` };
    },

    'export-bundle': async (values) => {
      const format = text(values, 'format');
      const params = format === 'pkcs12'
        ? { format, password: values.get('password') ?? '', legacy: text(values, 'legacy') || 'no' }
        : { format, include_key: text(values, 'include_key') || 'no' };
      const fileName = await downloadFrom('ORVA.Core.Certificate.Bundle', 'export', params,
        'export-bundle', 'The download failed.');
      const secret = format === 'pkcs12' || params.include_key === 'yes';
      return {
        text: `The server certificate was downloaded as ${fileName}.` +
          (secret ? ' It holds the private key: keep it safe.' : ''),
      };
    },
  };
}

const MAKING_REQUEST = 'Making the key and the request. This can take a minute.';

// What each form tells while the device works.
export const BUSY_TEXTS = {
  'crt-create': 'Making two keys and the certificates. This can take a minute; ' +
    'the form stays locked until the device answers.',
  'csr-create': MAKING_REQUEST,
  'csr-renew': MAKING_REQUEST,
  import: 'Checking and installing the files…',
  'import-bundle': 'Opening, checking and installing the bundle…',
  'csr-sign': 'Signing the request…',
  export: 'Packing the files…',
  'export-bundle': 'Making the file…',
  'acme-set': 'Saving the settings and asking the authority for the certificate. This can ' +
    'take a few minutes.',
  'acme-issue': 'Asking the authority for the certificate. This can take a few minutes.',
};
