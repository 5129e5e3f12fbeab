#ifndef ORVA_TOOLKIT_MKCERT_INTERNAL_H_
#define ORVA_TOOLKIT_MKCERT_INTERNAL_H_

#include <sys/wait.h>

#include <cstddef>
#include <string>
#include <vector>

#include "common/store_paths.h"
#include "platform/olib/olib_szlist.h"
#include "platform/olib/orva_root.h"

// What the toolkit's source files share and nobody else needs.

// Every toolkit command line fits this many bytes on the device,
// terminating zero included (see RootedCommandSize for other roots).
inline constexpr size_t kToolkitCommandSize = 512;

// The openssl tool of the device, under the device root.
inline std::string OpensslTool() { return OrvaPath(kOpensslTool); }

// Reading of a tool run that writes a key or certificate: it succeeded only
// when it ended by itself with exit code 0. A tool killed by a signal has
// exit code 0 in its status word yet may have left half a file.
inline bool ToolExitedCleanly(int status) {
  return status != -1 && WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

// A certificate carries at most this many alias names.
inline constexpr size_t kMaxAliases = 100;

// The names of the ";"-separated `aliases`, in order, empty ones kept.
// Null (logged) when there are more than kMaxAliases non-empty names or
// the list cannot be made or split.
OLIBSzListPtr SplitAliases(const char* aliases);

// The items of `list` in order, read in one pass.
std::vector<const char*> ListItems(const OLIBSZLIST* list);

#endif  // ORVA_TOOLKIT_MKCERT_INTERNAL_H_
