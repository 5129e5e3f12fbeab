// Sentences for the verdict the device gives on each certificate: which
// clients refuse it, and why.

const REASONS = {
  expired: 'it has expired',
  not_yet_valid: 'its validity has not begun yet',
  empty_names: 'its list of names is empty',
  name_missing: 'the device’s name is not among the certificate’s names',
  no_server_auth: 'it is not marked for use by servers',
  validity_too_long: 'it is valid for more than 825 days',
  weak_key: 'its key is too small',
  weak_signature: 'it is signed with an outdated hash (SHA-1 or MD5)',
  ca_not_strict: 'as an authority it lacks critical basic constraints or the right to sign ' +
    'certificates',
  incomplete_chain: 'the device does not present the certificate that issued it',
};

// Problems that no client has yet: a sentence of their own.
const NOTICES = {
  expires_soon: 'It expires within 30 days; from then on every client will refuse it.',
};

function joinNames(names) {
  if (names.length === 0) return 'Some clients';
  if (names.length === 1) return names[0];
  return `${names.slice(0, -1).join(', ')} and ${names.at(-1)}`;
}

// One sentence per problem of `compatibility` (the list's array of
// { code, clients }), in its order.
export function compatibilityWarnings(compatibility) {
  if (!Array.isArray(compatibility)) return [];
  return compatibility.map(({ code, clients }) => {
    if (NOTICES[code]) return NOTICES[code];
    const reason = REASONS[code] ?? `a problem this page does not know (${code})`;
    return `${joinNames(Array.isArray(clients) ? clients : [])} will refuse it: ${reason}.`;
  });
}
