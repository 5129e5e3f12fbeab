// The ACME section's rules, without the page: the form's values as the
// device's settings, the device's settings back as the form's values, and
// its status in words.

export const ACME_API = 'ORVA.Core.Certificate.ACME';

// The directories offered by name; any other https URL is a custom one.
export const DIRECTORIES = {
  letsencrypt: 'https://acme-v02.api.letsencrypt.org/directory',
  staging: 'https://acme-staging-v02.api.letsencrypt.org/directory',
};

function text(values, name) {
  const value = values.get(name);
  return typeof value === 'string' ? value.trim() : '';
}

// The domain names typed in `text`, split at line breaks, commas and
// blanks, without empty entries and repeats.
function typedDomains(text) {
  return [...new Set(String(text ?? '').split(/[\s,;]+/).filter((name) => name !== ''))];
}

// The sentence that names the first domain the device would refuse, or ''.
// A domain holds letters, digits, hyphens and dots; "*." may lead it, which
// only the DNS challenge can prove (the device tells that one).
export function domainsProblem(text) {
  const refused = typedDomains(text).find(
    (name) => !/^(\*\.)?[A-Za-z0-9-]+(\.[A-Za-z0-9-]+)*$/.test(name));
  if (refused === undefined) return '';
  return `“${refused}” is not a domain name. A domain name holds only letters, digits, ` +
    '“-” and “.”, and may start with “*.” for the DNS challenge. Type one name a line.';
}

// The parameters of the "set" method for the form's `values` (a FormData:
// domains, email, agree_tos, directory, custom_directory, challenge,
// dns_provider, key_type, renew_days and the credential rows'
// credential_name and credential_value). A DNS provider and credentials go
// only with the DNS challenge; rows without a name are left out.
export function acmeSettingsParams(values) {
  const challenge = text(values, 'challenge');
  const directory = text(values, 'directory');
  const params = {
    domains: JSON.stringify(typedDomains(values.get('domains'))),
    email: text(values, 'email'),
    agree_tos: values.get('agree_tos') === 'yes' ? 'yes' : 'no',
    directory: DIRECTORIES[directory] ?? text(values, 'custom_directory'),
    challenge,
    key_type: text(values, 'key_type'),
    renew_days: text(values, 'renew_days'),
  };
  if (challenge === 'dns-01') {
    const names = values.getAll('credential_name').map((name) => String(name).trim());
    const secrets = values.getAll('credential_value');
    const credentials = {};
    names.forEach((name, row) => { if (name !== '') credentials[name] = String(secrets[row] ?? ''); });
    params.dns_provider = text(values, 'dns_provider');
    params.dns_credentials = JSON.stringify(credentials);
  }
  return params;
}

// The form's values for the device's kept `settings` ("get"'s settings, or
// null): texts by field name, `credentials` the credential names (their
// values stay on the device).
export function acmeFormValues(settings) {
  if (!settings) return null;
  const named = Object.keys(DIRECTORIES).find((key) => DIRECTORIES[key] === settings.directory);
  return {
    domains: (settings.domains ?? []).join('\n'),
    email: settings.email ?? '',
    directory: named ?? 'custom',
    custom_directory: named ? '' : settings.directory ?? '',
    challenge: settings.challenge ?? 'http-01',
    dns_provider: settings.dns_provider ?? '',
    key_type: settings.key_type ?? 'ec256',
    renew_days: String(settings.renew_days ?? 30),
    credentials: settings.dns_credentials ?? [],
  };
}

// "2027-03-07 12:00 UTC" for the device's "2027-03-07T12:00:00Z"; '' for
// anything else.
function shownTime(iso) {
  const match = /^(\d{4}-\d{2}-\d{2})T(\d{2}:\d{2}):\d{2}Z$/.exec(String(iso ?? ''));
  return match ? `${match[1]} ${match[2]}\u00a0UTC` : '';
}

// The status panel's lines for "get"'s `data`: texts by line name (setup,
// attempt, result, error, issuer, expiry, renewal); '' hides a line.
export function acmeStatusLines(data) {
  const certificate = data?.certificate ?? null;
  const status = data?.status ?? {};
  const attempt = shownTime(status.time);
  const daysLeft = certificate?.days_left;
  return {
    setup: data?.settings ? `For ${data.settings.domains.join(', ')}, from ${data.settings.directory}.`
      : 'Not set up: fill in the form below to get a certificate.',
    attempt: attempt || 'None yet.',
    result: !attempt ? '' : status.result === 'success' ? 'The certificate was issued and installed.'
      : 'It failed; the device tries again at its next check, twice a day.',
    error: attempt && status.result !== 'success' ? status.error || 'No reason was given.' : '',
    issuer: certificate ? certificate.issuer || 'An authority without a name.'
      : 'The installed certificate did not come from an ACME authority.',
    expiry: certificate ? `${shownTime(certificate.valid_till)} (${daysLeft} ` +
      `${daysLeft === 1 ? 'day' : 'days'} left)` : '',
    renewal: shownTime(data?.next_renewal) ||
      (data?.settings ? 'None: no certificate of the authority is in service.' : ''),
  };
}
