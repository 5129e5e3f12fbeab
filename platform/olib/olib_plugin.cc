#include "platform/olib/olib_plugin.h"

#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <new>
#include <string>
#include <vector>

#include "platform/olib/olib_error.h"
#include "platform/olib/olib_file.h"
#include "platform/olib/olib_process.h"
#include "platform/olib/orva_root.h"

struct OLIBPluginContext {
  std::string event;
  std::vector<std::string> executables;
};

namespace {

bool IsPlainEvent(const char* event) {
  if (event == nullptr || *event == '\0') return false;
  for (const char* p = event; *p != '\0'; ++p) {
    unsigned char c = static_cast<unsigned char>(*p);
    if (c < 0x20 || c == 0x7F) return false;
  }
  return true;
}

std::vector<std::string> ListExecutables(const std::string& directory) {
  std::vector<std::string> found;
  std::error_code error;
  // The error_code forms never throw; an unreadable folder lists nothing.
  for (std::filesystem::directory_iterator entry(directory, error), end;
       !error && entry != end; entry.increment(error)) {
    std::string name = entry->path().filename().string();
    if (!OLIBIsSafeFileName(name.c_str())) continue;
    std::string path = directory + "/" + name;
    if (access(path.c_str(), X_OK) == 0) found.push_back(path);
  }
  std::sort(found.begin(), found.end());
  return found;
}

}  // namespace

int OLIBPluginSDKInit(const char* group, const char* event,
                      OLIBPLUGIN_HANDLE* handle) {
  if (handle == nullptr || !OLIBIsSafeFileName(group) || !IsPlainEvent(event)) {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  auto* context = new (std::nothrow) OLIBPluginContext;
  if (context == nullptr) {
    OLIB_SET_ERROR(OLIB_ERR_OUT_OF_MEMORY);
    return -1;
  }
  context->event = event;
  context->executables =
      ListExecutables(OrvaPath("/usr/orva/etc/plugins/") + group);
  *handle = context;
  return 0;
}

int OLIBPluginHasInit(OLIBPLUGIN_HANDLE handle) {
  return handle != nullptr ? 1 : 0;
}

int OLIBPluginAction(int action, OLIBPLUGIN_HANDLE handle) {
  if (handle == nullptr) {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  std::string action_text = std::to_string(action);
  int result = 0;
  for (const std::string& executable : handle->executables) {
    const char* argv[] = {executable.c_str(), handle->event.c_str(),
                          action_text.c_str(), nullptr};
    if (OLIBProcessRun(argv, kOLIBPluginActionSeconds) != 0) result = -1;
  }
  return result;
}

void OLIBPluginExit(OLIBPLUGIN_HANDLE handle) { delete handle; }
