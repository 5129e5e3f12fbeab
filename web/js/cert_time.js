// Reads the validity times the device prints for a certificate (for example
// "Dec  6 12:23:45 2035 GMT") and tells how long a certificate has left.

const MONTHS = ['Jan', 'Feb', 'Mar', 'Apr', 'May', 'Jun', 'Jul', 'Aug', 'Sep', 'Oct', 'Nov', 'Dec'];
const TIME_PATTERN =
  /^([A-Z][a-z]{2}) +(\d{1,2}) (\d{2}):(\d{2}):(\d{2})(?:\.\d+)? (\d{4})(?: GMT)?$/;
const DAY_MS = 24 * 60 * 60 * 1000;

// Days before the end of validity from which a certificate is marked.
const EXPIRY_WARNING_DAYS = 30;

// Returns the time as a Date, or null when the text is not such a time.
export function parseCertificateTime(text) {
  const match = TIME_PATTERN.exec(String(text ?? '').trim());
  if (match === null) return null;
  const month = MONTHS.indexOf(match[1]);
  const [day, hour, minute, second, year] = match.slice(2).map(Number);
  if (month < 0 || day < 1 || day > 31 || hour > 23 || minute > 59 || second > 60) return null;
  const date = new Date(Date.UTC(year, month, day, hour, minute, second));
  // Date.UTC rolls "Feb 31" over into March; such a text is no date.
  return date.getUTCDate() === day ? date : null;
}

// Whole days from `start` to `end`, rounded down; negative when `end` is earlier.
export function wholeDaysBetween(start, end) {
  return Math.floor((end.getTime() - start.getTime()) / DAY_MS);
}

// Whole days from `now` until `until`: 0 on the last day, negative once expired.
export function daysLeft(until, now) {
  return wholeDaysBetween(now, until);
}

// One of 'expired', 'expiring' (within EXPIRY_WARNING_DAYS), 'not-yet-valid',
// 'valid', or 'unknown' when the end of validity is not known.
export function validityState(from, until, now) {
  if (until === null) return 'unknown';
  if (until.getTime() <= now.getTime()) return 'expired';
  if (from !== null && from.getTime() > now.getTime()) return 'not-yet-valid';
  if (daysLeft(until, now) <= EXPIRY_WARNING_DAYS) return 'expiring';
  return 'valid';
}

// "2035-12-06 12:23 UTC": unambiguous in every language. The time of day
// and "UTC" are joined by a no-break space, so that a narrow column breaks
// the text only after the date.
export function formatCertificateTime(date) {
  const pad = (number) => String(number).padStart(2, '0');
  return `${date.getUTCFullYear()}-${pad(date.getUTCMonth() + 1)}-${pad(date.getUTCDate())} ` +
    `${pad(date.getUTCHours())}:${pad(date.getUTCMinutes())}\u00a0UTC`;
}
