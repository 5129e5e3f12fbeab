// Reads the members of a ZIP archive (stored or deflated), enough to look
// into the archives the device hands out.

import { inflateRawSync } from 'node:zlib';

const END_OF_DIRECTORY = 0x06054b50;
const DIRECTORY_ENTRY = 0x02014b50;
const LOCAL_HEADER = 0x04034b50;

// Returns [{ name, content (Buffer) }] in directory order; throws on a
// buffer that is no ZIP archive.
export function zipMembers(archive) {
  let end = archive.length - 22;
  while (end >= 0 && archive.readUInt32LE(end) !== END_OF_DIRECTORY) end -= 1;
  if (end < 0) throw new Error('not a ZIP archive');
  const count = archive.readUInt16LE(end + 10);
  let entry = archive.readUInt32LE(end + 16);

  const members = [];
  for (let index = 0; index < count; index += 1) {
    if (archive.readUInt32LE(entry) !== DIRECTORY_ENTRY) throw new Error('broken ZIP directory');
    const method = archive.readUInt16LE(entry + 10);
    const compressedSize = archive.readUInt32LE(entry + 20);
    const nameLength = archive.readUInt16LE(entry + 28);
    const extraLength = archive.readUInt16LE(entry + 30);
    const commentLength = archive.readUInt16LE(entry + 32);
    const localOffset = archive.readUInt32LE(entry + 42);
    const name = archive.toString('utf8', entry + 46, entry + 46 + nameLength);

    if (archive.readUInt32LE(localOffset) !== LOCAL_HEADER) throw new Error('broken ZIP member');
    const dataStart = localOffset + 30 + archive.readUInt16LE(localOffset + 26) +
      archive.readUInt16LE(localOffset + 28);
    const data = archive.subarray(dataStart, dataStart + compressedSize);
    if (method !== 0 && method !== 8) throw new Error(`ZIP method ${method} of ${name}`);
    members.push({ name, content: method === 8 ? inflateRawSync(data) : Buffer.from(data) });
    entry += 46 + nameLength + extraLength + commentLength;
  }
  return members;
}
