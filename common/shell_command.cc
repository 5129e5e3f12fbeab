#include "common/shell_command.h"

#include <unistd.h>

#include <cstring>

#include "common/log.h"
#include "platform/olib/olib_process.h"
#include "platform/olib/orva_root.h"

extern char** environ;

ShellCommand::ShellCommand(size_t capacity) : buffer_(capacity > 0 ? capacity : 1, '\0') {}

bool ShellCommand::Put(const char* text, size_t length) {
  if (!fits_) return false;
  if (length_ + length + 1 > buffer_.size()) {
    fits_ = false;
    return false;
  }
  std::memcpy(&buffer_[length_], text, length);
  length_ += length;
  buffer_[length_] = '\0';
  return true;
}

bool ShellCommand::PutQuoted(const std::string& text) {
  if (!Put("'", 1)) return false;
  size_t start = 0;
  for (size_t quote = text.find('\''); quote != std::string::npos;
       quote = text.find('\'', start)) {
    if (!Put(text.data() + start, quote - start) || !Put("'\\''", 4)) {
      return false;
    }
    start = quote + 1;
  }
  return Put(text.data() + start, text.size() - start) && Put("'", 1);
}

bool ShellCommand::Append(const char* format,
                          std::initializer_list<CommandArg> args) {
  const CommandArg* next = args.begin();
  const char* literal = format;
  const char* p = format;
  while (fits_ && *p != '\0') {
    if (p[0] != '%' || (p[1] != 's' && p[1] != 'd')) {
      ++p;
      continue;
    }
    Put(literal, static_cast<size_t>(p - literal));
    bool wants_text = p[1] == 's';
    if (next == args.end() || next->is_text() != wants_text) {
      fits_ = false;
      break;
    }
    if (wants_text) {
      PutQuoted(next->text());
    } else {
      std::string number = std::to_string(next->number());
      Put(number.data(), number.size());
    }
    ++next;
    p += 2;
    literal = p;
  }
  Put(literal, static_cast<size_t>(p - literal));
  if (next != args.end()) fits_ = false;
  return fits_;
}

size_t RootedCommandSize(size_t deviceSize) {
  size_t root_prefix = OrvaPath("/").size() - 1;
  return deviceSize + kMaxRootedPaths * root_prefix;
}

namespace {

pid_t StartShell(const ShellCommand& command, int* stdoutFd,
                 const char* const* environment = environ) {
  if (!command.fits()) {
    ORVA_LOG("Command refused, it does not fit its buffer: %.200s",
             command.line());
    return -1;
  }
  const char* argv[] = {"/bin/sh", "-c", command.line(), nullptr};
  return OLIBProcessSpawnWithEnvironment(argv, environment, stdoutFd);
}

// The caller's environment without the entries `extra` names, then `extra`.
// The pointers borrow from environ and `extra`.
std::vector<const char*> EnvironmentWith(const std::vector<std::string>& extra) {
  std::vector<const char*> entries;
  for (char** inherited = environ; *inherited != nullptr; ++inherited) {
    const std::string entry = *inherited;
    const std::string name = entry.substr(0, entry.find('=') + 1);
    bool replaced = false;
    for (const std::string& added : extra) {
      replaced = replaced || added.compare(0, name.size(), name) == 0;
    }
    if (!replaced) entries.push_back(*inherited);
  }
  for (const std::string& added : extra) entries.push_back(added.c_str());
  entries.push_back(nullptr);
  return entries;
}

}  // namespace

int RunShellCommand(const ShellCommand& command) {
  pid_t pid = StartShell(command, nullptr);
  if (pid < 0) return -1;
  return OLIBProcessWait(pid, 0);
}

int RunShellCommandWith(const ShellCommand& command,
                        const std::vector<std::string>& extraEnvironment,
                        int timeoutSeconds) {
  const std::vector<const char*> environment = EnvironmentWith(extraEnvironment);
  pid_t pid = StartShell(command, nullptr, environment.data());
  if (pid < 0) return -1;
  return OLIBProcessWait(pid, timeoutSeconds);
}

ShellPipe::ShellPipe(const ShellCommand& command) {
  int fd = -1;
  pid_ = StartShell(command, &fd);
  if (pid_ < 0) return;
  stream_ = fdopen(fd, "r");
  if (stream_ == nullptr) close(fd);  // The child then sees a closed pipe.
}

ShellPipe::~ShellPipe() { Close(); }

int ShellPipe::Close() {
  if (stream_ != nullptr) {
    std::fclose(stream_);
    stream_ = nullptr;
  }
  if (pid_ < 0) return -1;
  int status = OLIBProcessWait(pid_, 0);
  pid_ = -1;
  return status;
}
