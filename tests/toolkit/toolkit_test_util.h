#ifndef ORVA_TESTS_TOOLKIT_TOOLKIT_TEST_UTIL_H_
#define ORVA_TESTS_TOOLKIT_TOOLKIT_TEST_UTIL_H_

#include <functional>
#include <string>

#include "api/csr_argument.h"
#include "tests/support/test_support.h"

// A complete subject with a two-letter country.
CSR_ARGUMENT FullSubject();

// Names of the entries of `directory` holding ".tmp" (the toolkit's
// temporary files), joined by blanks.
std::string TemporaryFilesIn(const std::string& directory);

// Runs `body` as an unprivileged user: when the tests run as root, in a
// child process that owns the device root and has given up root's rights;
// otherwise directly. True when `body` returned true.
bool RunAsUnprivilegedUser(const TempDeviceRoot& root, const std::function<bool()>& body);

// Replaces the device's openssl with a script that runs the real tool
// except for the subcommand `failing`, which ends with exit code 1.
void FailToolSubcommand(const TempDeviceRoot& root, const std::string& failing);

#endif  // ORVA_TESTS_TOOLKIT_TOOLKIT_TEST_UTIL_H_
