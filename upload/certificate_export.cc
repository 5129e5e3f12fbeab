#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <vector>

#include "common/log.h"
#include "common/shell_command.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "platform/webapi/api_download.h"
#include "toolkit/generation_area.h"
#include "upload/sslca_form_handler.h"

namespace {

// Command lines of the export fit in this many bytes on the device,
// terminating zero included (see RootedCommandSize for other roots).
constexpr size_t kExportCommandSize = 512;

// Store files that the export can pack, as device paths.
const char* const exportFileTable[] = {
    kCaCrtPath,     kCaKeyPath,  kServerCrtPath, kServerKeyPath,
    kInterCrtPath,  kGenCsrPath, kGenKeyPath,
};

// A set the client can ask for: its members as device paths, and whether
// they are handed out once (removed once packed).
struct ExportSet {
  std::vector<const char*> members;
  bool handed_out_once;
};

// The set named `choice` (compared exactly); false for any other name.
bool FindExportSet(const std::string& choice, ExportSet* set) {
  if (choice == "archive") {
    *set = {{exportFileTable[0], exportFileTable[1], exportFileTable[2],
             exportFileTable[3], exportFileTable[4]},
            false};
  } else if (choice == "csr_set") {
    *set = {{exportFileTable[5], exportFileTable[6]}, true};
  } else if (choice == "signed_set") {
    *set = {{kGenCrtPath}, true};
  } else {
    return false;
  }
  return true;
}

// Removes the previous archive when it is a plain file or absent, which is
// what "rm -rf" would do, without starting a shell and rm for it. False when
// something else is in the way (a folder, a file that does not unlink); the
// command is then left to remove it or to fail as it would.
bool RemovedPlainArchive(const char* archive) {
  struct stat info;
  if (lstat(archive, &info) != 0) return errno == ENOENT;
  return !S_ISDIR(info.st_mode) && unlink(archive) == 0;
}

}  // namespace

int SSLCAFormHandler::CreateArchive(const char** files, const char* archive,
                                    int count) {
  // Members are counted before the previous archive goes: a client that
  // asks again for a set handed out once must not lose the last copy.
  int present = 0;
  for (int i = 0; i < count; ++i) {
    if (access(files[i], F_OK) == 0) ++present;
  }
  if (present == 0) {
    ORVA_LOG("No file will be compress");
    return -1;
  }
  if (!RemovedPlainArchive(archive)) {
    ShellCommand remove(RootedCommandSize(kExportCommandSize));
    remove.Append("/bin/rm -rf %s", {archive});
    if (RunShellCommand(remove) != 0) {
      ORVA_LOG_LASTERR("Remove previous archive failed");
      return -1;
    }
  }

  // The archive holds keys: the archiver makes it owner-only from the start.
  ShellCommand pack(RootedCommandSize(kExportCommandSize));
  pack.Append("umask 077; %s a %s", {OrvaPath(k7zTool), archive});
  for (int i = 0; i < count; ++i) {
    if (access(files[i], F_OK) == 0) pack.Append(" %s", {files[i]});
  }
  pack.Append(" >/dev/null 2>&1");
  if (RunShellCommand(pack) != 0) {
    ORVA_LOG_LASTERR("7z file failed");
    return -1;
  }
  chmod(archive, 0400);  // Ignoring the result: the archive is complete.
  return 0;
}

void SSLCAFormHandler::DownloadAction(ORVA::APIRequest* request,
                                      ORVA::APIResponse* response) {
  ORVA::APIDownload download;
  const std::string choice = request->GetParam("file", "").asString();
  ExportSet set;
  if (!FindExportSet(choice, &set)) return;

  std::vector<std::string> paths;
  for (const char* member : set.members) paths.push_back(OrvaPath(member));
  std::vector<const char*> files;
  for (const std::string& path : paths) files.push_back(path.c_str());
  const std::string archivePath = OrvaPath(kArchivePath);
  // The archive tool would make a missing generation area with the default
  // mode; it holds keys, so it is made private first.
  MakeGenerationArea();  // Ignoring errors: CreateArchive reports them.
  if (CreateArchive(files.data(), archivePath.c_str(),
                    static_cast<int>(files.size())) < 0) {
    ORVA_LOG_LASTERR("Create archive failed");
    return;
  }
  if (set.handed_out_once) {
    // Ignoring the results: a member that is already gone is handed out.
    for (const std::string& path : paths) unlink(path.c_str());
  }
  const std::string fileName = "archive.zip";

  if (access(archivePath.c_str(), F_OK) != 0) return;
  response->SetEnableOutput(false);
  std::string headerValue = "attachment; filename=";
  headerValue += "\"" + fileName + "\"";
  download.SetHeader("content-disposition", headerValue);
  // The host answers a download without a body as a failure itself.
  download.Output(archivePath);
}
