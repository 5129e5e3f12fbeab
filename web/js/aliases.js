// The list of other names of a machine, typed one a line, as the device takes
// it: names separated by ";". The device accepts host names made of letters,
// digits, ".", "-", "_" and "*", and IP addresses.

const HOST_NAME = /^[A-Za-z0-9._*-]{1,253}$/;
const IPV6_ADDRESS = /^[0-9A-Fa-f:.]{2,45}$/;

const MAX_ALIASES = 100;

function acceptedName(name) {
  return HOST_NAME.test(name) || (name.includes(':') && IPV6_ADDRESS.test(name));
}

// Splits `text` at line breaks, commas, semicolons and blanks, and drops
// empty entries and repeats. Returns { names, refused }: the names in the
// order typed, and those the device would not accept.
export function parseAliases(text) {
  const names = [];
  for (const name of String(text ?? '').split(/[\s,;]+/)) {
    if (name !== '' && !names.includes(name)) names.push(name);
  }
  return { names, refused: names.filter((name) => !acceptedName(name)) };
}

// The sentence that tells what is wrong with the list, or '' when nothing is.
export function aliasProblem(text) {
  const { names, refused } = parseAliases(text);
  if (refused.length > 0) {
    return `“${refused[0]}” is not a host name or IP address. ` +
      'Use letters, digits, “.”, “-”, “_” and “*” only, one name a line.';
  }
  if (names.length > MAX_ALIASES) return `Enter at most ${MAX_ALIASES} names.`;
  return '';
}

// The list as the device takes it.
export function joinAliases(text) {
  return parseAliases(text).names.join(';');
}
