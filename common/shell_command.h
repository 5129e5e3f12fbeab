#ifndef ORVA_COMMON_SHELL_COMMAND_H_
#define ORVA_COMMON_SHELL_COMMAND_H_

#include <sys/types.h>

#include <cstddef>
#include <cstdio>
#include <initializer_list>
#include <string>
#include <vector>

// The system's one way to run a shell command.
//
// A command line is built into a zero-filled buffer of fixed size from a
// template written in the code. In the template "%s" takes the next text
// argument, which is written in single quotes with every embedded quote
// written as '\'' so the shell sees it as one word, whatever it holds; "%d"
// takes the next number. Everything else is copied as it stands.
//
// A line that would not fit its buffer (terminating zero included) is never
// run cut: it is marked, and running it is refused with a log line.
// Commands run with standard input from /dev/null and without a controlling
// terminal, so no tool can stop and wait for a password.

// One argument of a template: a text to quote or a number.
class CommandArg {
 public:
  CommandArg(const char* text) : is_text_(true), text_(text ? text : "") {}
  CommandArg(const std::string& text) : is_text_(true), text_(text) {}
  CommandArg(int number) : is_text_(false), number_(number) {}
  CommandArg(unsigned int number) : is_text_(false), number_(number) {}
  CommandArg(long number) : is_text_(false), number_(number) {}

  bool is_text() const { return is_text_; }
  const std::string& text() const { return text_; }
  long long number() const { return number_; }

 private:
  bool is_text_;
  std::string text_;
  long long number_ = 0;
};

class ShellCommand {
 public:
  // `capacity` is the buffer size in bytes, terminating zero included.
  explicit ShellCommand(size_t capacity);

  // Appends `format` with its arguments substituted. A template whose
  // placeholders do not match the arguments marks the command as unusable,
  // as does a line that would not fit. Returns fits().
  bool Append(const char* format, std::initializer_list<CommandArg> args = {});

  // True while every part appended so far fitted and matched its template.
  bool fits() const { return fits_; }
  // The line built so far (always zero-terminated).
  const char* line() const { return buffer_.data(); }

 private:
  bool Put(const char* text, size_t length);
  bool PutQuoted(const std::string& text);

  std::vector<char> buffer_;
  size_t length_ = 0;
  bool fits_ = true;
};

// Buffer size for a command line that takes `deviceSize` bytes on the
// device itself, where the device root is "/": adds room for the root
// prefix of every path such a line can hold (at most kMaxRootedPaths), so a
// test or development root does not make a sound line too long.
inline constexpr size_t kMaxRootedPaths = 8;
size_t RootedCommandSize(size_t deviceSize);

// Runs `command` with /bin/sh -c and waits for it. Returns the raw wait
// status as `system` does (read it with WEXITSTATUS or as a whole), or -1
// when the command did not fit (logged; nothing runs) or the shell could not
// be started.
int RunShellCommand(const ShellCommand& command);

// RunShellCommand for a tool that takes secrets from its environment and
// may hang on the network: the command inherits the caller's environment
// with each "NAME=value" entry of `extraEnvironment` added, replacing an
// inherited entry of the same name, and is killed with its process group
// after `timeoutSeconds` (> 0). The entries reach the child only: they are
// never logged and never part of the line. Returns the wait status; -1
// when the command did not fit (logged), could not start, or ran out of
// time (the system library's last error then OLIB_ERR_TIMEOUT).
int RunShellCommandWith(const ShellCommand& command,
                        const std::vector<std::string>& extraEnvironment,
                        int timeoutSeconds);

// A running command whose standard output is read through stream(). The
// destructor closes the stream and waits for the command.
class ShellPipe {
 public:
  // Starts `command`. A command that did not fit is refused with a log
  // line; stream() is then null, as it is when the shell could not start.
  explicit ShellPipe(const ShellCommand& command);
  ~ShellPipe();

  ShellPipe(const ShellPipe&) = delete;
  ShellPipe& operator=(const ShellPipe&) = delete;

  // The command's standard output, or null when it did not start. Owned by
  // this object.
  FILE* stream() const { return stream_; }

  // Closes the stream and waits for the command; returns its wait status,
  // or -1 when it never started. Later calls return -1.
  int Close();

 private:
  FILE* stream_ = nullptr;
  pid_t pid_ = -1;
};

#endif  // ORVA_COMMON_SHELL_COMMAND_H_
