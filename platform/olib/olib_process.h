#ifndef ORVA_PLATFORM_OLIB_OLIB_PROCESS_H_
#define ORVA_PLATFORM_OLIB_OLIB_PROCESS_H_

#include <sys/types.h>

// Process control of the system library: the one place where the system
// starts other programs. Every child gets standard input from /dev/null and
// runs in a session of its own, without a controlling terminal, so no tool
// can ever stop and wait for a password.

// Starts the program `argv[0]` (a path) with the null-terminated argument
// list `argv` and the caller's environment. When `stdoutFd` is not null, the
// child's standard output is a pipe whose read end (close-on-exec) is stored
// in *stdoutFd and belongs to the caller; otherwise the child shares the
// caller's standard output. Returns the child's pid, or -1 with the last
// error set (and *stdoutFd untouched).
pid_t OLIBProcessSpawn(const char* const argv[], int* stdoutFd);

// OLIBProcessSpawn with `environment` (a null-terminated list of
// "NAME=value" entries, borrowed for the call) as the child's whole
// environment in place of the caller's.
pid_t OLIBProcessSpawnWithEnvironment(const char* const argv[],
                                      const char* const environment[], int* stdoutFd);

// Waits for the child `pid`. With `timeoutSeconds` > 0, a child still
// running after that many seconds is killed with its whole process group and
// reaped, and the result is -1 with the last error OLIB_ERR_TIMEOUT.
// Otherwise returns the wait status as waitpid reports it (decode with
// WIFEXITED and friends), or -1 with the last error set when waiting failed.
int OLIBProcessWait(pid_t pid, int timeoutSeconds);

// Runs `argv[0]` as OLIBProcessSpawn does, without a pipe, and waits for it
// as OLIBProcessWait does. Returns 0 when it exited with status 0; -1
// otherwise (not startable, non-zero exit with OLIB_ERR_CHILD_FAILED, a
// signal, or the time limit), with the last error set.
int OLIBProcessRun(const char* const argv[], int timeoutSeconds);

#endif  // ORVA_PLATFORM_OLIB_OLIB_PROCESS_H_
