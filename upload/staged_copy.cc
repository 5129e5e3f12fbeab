#include "upload/staged_copy.h"

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <vector>

#include "common/api_errors.h"
#include "common/log.h"
#include "common/shell_command.h"
#include "platform/olib/olib_file.h"

namespace {

// Command lines of the import fit in this many bytes, terminating zero
// included.
constexpr size_t kImportCommandSize = 8192;

std::string DirectoryOf(const std::string& path) {
  std::string::size_type slash = path.rfind('/');
  return slash == std::string::npos || slash == 0 ? "/" : path.substr(0, slash);
}

// Makes `directory` with its parents when it is missing. Only the exit
// status of the command counts.
bool MakeDirectory(const std::string& directory) {
  if (OLIBCFileExist(directory.c_str()) != 0) return true;
  ShellCommand command(kImportCommandSize);
  command.Append("/bin/mkdir -p %s", {directory});
  int status = RunShellCommand(command);
  if (WEXITSTATUS(status) != 0) {
    ORVA_LOG("%s failed.(errno:%d/%m)", command.line(), errno);
    return false;
  }
  return true;
}

}  // namespace

StagedCopy::~StagedCopy() {
  if (!temporary_.empty()) unlink(temporary_.c_str());
}

int StagedCopy::Stage(const std::string& source, const std::string& target,
                      mode_t mode) {
  const std::string directory = DirectoryOf(target);
  if (!MakeDirectory(directory)) return kErrStoreWrite;

  std::string name = target;
  name.insert(directory.size() + 1, ".");
  name += ".XXXXXX";
  std::vector<char> pattern(name.begin(), name.end());
  pattern.push_back('\0');
  int fd = mkstemp(pattern.data());
  if (fd < 0) {
    ORVA_LOG("Create %s failed.(errno:%d/%m)", name.c_str(), errno);
    return kErrStoreWrite;
  }
  close(fd);
  temporary_ = pattern.data();
  target_ = target;

  ShellCommand command(kImportCommandSize);
  command.Append("/bin/cp %s %s", {source, temporary_});
  if (RunShellCommand(command) != 0) {
    ORVA_LOG("CA copy command failed:%s", command.line());
    return kErrStoreWrite;
  }
  if (chmod(temporary_.c_str(), mode) != 0) {
    ORVA_LOG("Set mode of %s failed.(errno:%d/%m)", temporary_.c_str(), errno);
    return kErrStoreWrite;
  }
  return kErrNone;
}

int StagedCopy::Commit() {
  if (rename(temporary_.c_str(), target_.c_str()) != 0) {
    ORVA_LOG("Install %s failed.(errno:%d/%m)", target_.c_str(), errno);
    return kErrStoreWrite;
  }
  temporary_.clear();
  return kErrNone;
}
