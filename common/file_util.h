#ifndef ORVA_COMMON_FILE_UTIL_H_
#define ORVA_COMMON_FILE_UTIL_H_

#include <sys/types.h>

#include <string>
#include <vector>

// Small file-system helpers shared by the module and the host.

// The folder of `path`: everything before its last "/", "/" for a path
// directly under the root, and "." for a bare name.
std::string DirectoryOf(const std::string& path);

// Makes the folder `path` with the folders above it when it is missing, by
// running "/bin/mkdir -p 'PATH'" through the command runner. True when
// `path` was there or the command succeeded; otherwise false, logged as
// "COMMAND failed.(errno:N/TEXT)" (folders made on the way stay).
bool MakeDirectories(const std::string& path);

// Appends the content of the file at `path` to *content, up to its end or
// the first read error. False only when the file cannot be opened.
bool ReadWholeFile(const std::string& path, std::string* content);

// Writes `text` over the content of the existing file at `path`, keeping
// its mode. False (errno set) when it cannot.
bool OverwriteFile(const std::string& path, const std::string& text);

// Writes all `size` bytes at `data` to `fd`, retrying after interruptions
// and short writes. False with errno set when a write fails.
bool WriteAll(int fd, const char* data, size_t size);

// The folder of the running program; "." when it cannot be read.
std::string ExecutableDirectory();

// Flushes the folder `path` so that renames in it outlast a power cut.
// Failures are ignored: the renames themselves are done.
void SyncDirectory(const std::string& path);

// The names in the folder `path` that do not begin with ".", sorted; empty
// when it cannot be read.
std::vector<std::string> VisibleEntries(const std::string& path);

// Removes every entry of the folder `path` but "." and "..", hidden ones
// included; entries that are folders themselves are not emptied. True when
// nothing is left or the folder does not exist; false (errno set) when an
// entry stays.
bool RemoveFolderEntries(const std::string& path);

// The device's MAC address as the machine shows it: the address of the
// first network interface (by name) that is not a loopback interface and
// has a 12-digit, non-zero hardware address, as 12 upper-case hex digits
// without colons; "" when there is none. `interfaces` is the folder that
// lists them ("/sys/class/net" on Linux).
std::string FirstInterfaceMacAddress(const std::string& interfaces = "/sys/class/net");

#endif  // ORVA_COMMON_FILE_UTIL_H_
