// The list of other names of a machine, typed one a line, as the device takes
// it: names separated by ";". The device takes a name of ASCII letters,
// digits, ".", "-", "_" and "*" (so every IPv4 address), or an IPv6 address
// as the system's address parser reads it; anything else it refuses.

const HOST_NAME = /^[A-Za-z0-9._*-]+$/;
const OCTET = '(?:25[0-5]|2[0-4][0-9]|1[0-9][0-9]|[1-9]?[0-9])';
const IPV4_ADDRESS = new RegExp(`^${OCTET}(?:\\.${OCTET}){3}$`);
const HEX_GROUP = /^[0-9A-Fa-f]{1,4}$/;

// Eight groups of one to four hex digits, or fewer with one "::" standing
// for the missing ones; the last two groups may be an IPv4 address. No zone
// ("%eth0") and no brackets: the parser takes neither.
function isIpv6Address(name) {
  const lastColon = name.lastIndexOf(':');
  const tail = name.slice(lastColon + 1);
  let groupsText = name;
  if (tail.includes('.')) {
    if (!IPV4_ADDRESS.test(tail)) return false;
    groupsText = `${name.slice(0, lastColon + 1)}0:0`;
  }
  const halves = groupsText.split('::');
  if (halves.length > 2) return false;
  const groups = halves.flatMap((half) => (half === '' ? [] : half.split(':')));
  if (!groups.every((group) => HEX_GROUP.test(group))) return false;
  return halves.length === 2 ? groups.length < 8 : groups.length === 8;
}

// The names in `text`, split at line breaks, commas, semicolons and blanks,
// in the order typed, without empty entries and repeats.
function typedNames(text) {
  return [...new Set(String(text ?? '').split(/[\s,;]+/).filter((name) => name !== ''))];
}

// The sentence that names the first name the device would refuse, or ''.
export function aliasProblem(text) {
  const refused = typedNames(text).find((name) => !HOST_NAME.test(name) && !isIpv6Address(name));
  if (refused === undefined) return '';
  return `“${refused}” is not a host name or IP address. A host name holds only letters, ` +
    'digits, “.”, “-”, “_” and “*”. Type one name a line.';
}

// The list as the device takes it.
export function joinAliases(text) {
  return typedNames(text).join(';');
}
