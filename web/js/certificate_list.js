// Reads the installed certificates. The device answers "not installed"
// (5504) for a whole list when one of its files is missing, so each role is
// asked for on its own and a missing one simply gives no rows.

const ROLES = ['server_cert', 'root_cert', 'inter_cert'];
const NOT_INSTALLED = 5504;

// Resolves with the certificate entries of every installed role, in the
// order server, local CA, intermediate; rejects with the first other error.
export async function loadInstalledCertificates(api) {
  const answers = await Promise.allSettled(ROLES.map((type) =>
    api.call('ORVA.Core.Certificate', 'list', {
      type,
      additional: JSON.stringify(['valid_from', 'valid_till', 'compatibility']),
    })));
  const entries = [];
  for (const answer of answers) {
    if (answer.status === 'fulfilled') {
      entries.push(...(answer.value?.certificates ?? []));
    } else if (answer.reason?.kind !== 'module' || answer.reason.code !== NOT_INSTALLED) {
      throw answer.reason;
    }
  }
  return entries;
}
