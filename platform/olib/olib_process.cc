#include "platform/olib/olib_process.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>

#include "platform/olib/olib_error.h"

extern char** environ;

namespace {

// Owns the attributes and file actions of one posix_spawn call.
class SpawnSetup {
 public:
  SpawnSetup() {
    ok_ = posix_spawnattr_init(&attributes_) == 0;
    if (!ok_) return;
    if (posix_spawn_file_actions_init(&actions_) != 0) {
      posix_spawnattr_destroy(&attributes_);
      ok_ = false;
    }
  }
  ~SpawnSetup() {
    if (!ok_) return;
    posix_spawn_file_actions_destroy(&actions_);
    posix_spawnattr_destroy(&attributes_);
  }
  SpawnSetup(const SpawnSetup&) = delete;
  SpawnSetup& operator=(const SpawnSetup&) = delete;

  bool ok() const { return ok_; }
  posix_spawnattr_t* attributes() { return &attributes_; }
  posix_spawn_file_actions_t* actions() { return &actions_; }

 private:
  bool ok_ = false;
  posix_spawnattr_t attributes_;
  posix_spawn_file_actions_t actions_;
};

long long MonotonicMillis() {
  struct timespec now;
  clock_gettime(CLOCK_MONOTONIC, &now);
  return now.tv_sec * 1000LL + now.tv_nsec / 1000000;
}

}  // namespace

pid_t OLIBProcessSpawn(const char* const argv[], int* stdoutFd) {
  return OLIBProcessSpawnWithEnvironment(argv, environ, stdoutFd);
}

pid_t OLIBProcessSpawnWithEnvironment(const char* const argv[],
                                      const char* const environment[], int* stdoutFd) {
  if (argv == nullptr || argv[0] == nullptr) {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  SpawnSetup setup;
  if (!setup.ok()) {
    OLIB_SET_ERROR(OLIB_ERR_OUT_OF_MEMORY);
    return -1;
  }
  int pipe_fds[2] = {-1, -1};
  if (stdoutFd != nullptr && pipe2(pipe_fds, O_CLOEXEC) != 0) {
    OLIB_SET_ERROR(errno);
    return -1;
  }
  sigset_t default_signals;
  sigemptyset(&default_signals);
  sigaddset(&default_signals, SIGPIPE);
  sigaddset(&default_signals, SIGCHLD);
  sigset_t no_signals;
  sigemptyset(&no_signals);
  int failure =
      posix_spawnattr_setflags(setup.attributes(),
                               POSIX_SPAWN_SETSID | POSIX_SPAWN_SETSIGDEF |
                                   POSIX_SPAWN_SETSIGMASK);
  if (failure == 0) {
    failure = posix_spawnattr_setsigdefault(setup.attributes(), &default_signals);
  }
  if (failure == 0) {
    failure = posix_spawnattr_setsigmask(setup.attributes(), &no_signals);
  }
  if (failure == 0) {
    failure = posix_spawn_file_actions_addopen(setup.actions(), STDIN_FILENO,
                                               "/dev/null", O_RDONLY, 0);
  }
  if (failure == 0 && stdoutFd != nullptr) {
    failure = posix_spawn_file_actions_adddup2(setup.actions(), pipe_fds[1],
                                               STDOUT_FILENO);
  }
  pid_t pid = -1;
  if (failure == 0) {
    failure = posix_spawn(&pid, argv[0], setup.actions(), setup.attributes(),
                          const_cast<char* const*>(argv),
                          const_cast<char* const*>(environment));
  }
  if (stdoutFd != nullptr) close(pipe_fds[1]);
  if (failure != 0) {
    if (stdoutFd != nullptr) close(pipe_fds[0]);
    OLIB_SET_ERROR(failure);
    return -1;
  }
  if (stdoutFd != nullptr) *stdoutFd = pipe_fds[0];
  return pid;
}

int OLIBProcessWait(pid_t pid, int timeoutSeconds) {
  if (pid <= 0) {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  int status = 0;
  if (timeoutSeconds <= 0) {
    for (;;) {
      if (waitpid(pid, &status, 0) == pid) return status;
      if (errno != EINTR) {
        OLIB_SET_ERROR(errno);
        return -1;
      }
    }
  }
  const long long deadline = MonotonicMillis() + timeoutSeconds * 1000LL;
  long long pause_millis = 1;
  for (;;) {
    pid_t done = waitpid(pid, &status, WNOHANG);
    if (done == pid) return status;
    if (done < 0 && errno != EINTR) {
      OLIB_SET_ERROR(errno);
      return -1;
    }
    if (MonotonicMillis() >= deadline) break;
    struct timespec pause = {0, pause_millis * 1000000L};
    nanosleep(&pause, nullptr);
    if (pause_millis < 50) pause_millis *= 2;
  }
  kill(-pid, SIGKILL);  // The child leads its own session and group.
  while (waitpid(pid, &status, 0) < 0 && errno == EINTR) {
  }
  OLIB_SET_ERROR(OLIB_ERR_TIMEOUT);
  return -1;
}

int OLIBProcessRun(const char* const argv[], int timeoutSeconds) {
  pid_t pid = OLIBProcessSpawn(argv, nullptr);
  if (pid < 0) return -1;
  int status = OLIBProcessWait(pid, timeoutSeconds);
  if (status == -1) return -1;
  if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
    OLIB_SET_ERROR(OLIB_ERR_CHILD_FAILED);
    return -1;
  }
  return 0;
}
