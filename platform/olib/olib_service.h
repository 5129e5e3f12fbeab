#ifndef ORVA_PLATFORM_OLIB_OLIB_SERVICE_H_
#define ORVA_PLATFORM_OLIB_OLIB_SERVICE_H_

// Services of the device. Each service is one executable file
// "/usr/orva/etc/services/NAME" under the device root; present and
// executable means enabled. A service name holds only letters, digits, ".",
// "-" and "_" and is neither "." nor "..".

// Seconds a restart may take before the service's process group is killed.
constexpr int kOLIBServiceRestartSeconds = 30;

// Nonzero when the service's executable exists and may be executed.
int OLIBServiceIsEnabled(const char* name);

// Runs the service's executable with the single argument "restart" and
// waits for it, at most kOLIBServiceRestartSeconds. Returns 0 when it exited
// with status 0; -1 otherwise (bad name, not startable, non-zero exit,
// signal or time limit), with the last error set.
int OLIBServiceRestart(const char* name);

#endif  // ORVA_PLATFORM_OLIB_OLIB_SERVICE_H_
