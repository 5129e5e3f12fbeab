#ifndef ORVA_TESTS_TOOLKIT_TOOLKIT_TEST_UTIL_H_
#define ORVA_TESTS_TOOLKIT_TOOLKIT_TEST_UTIL_H_

#include <string>

#include "api/subject_reader.h"
#include "tests/support/test_support.h"

// A complete subject with a two-letter country.
CSR_ARGUMENT FullSubject();

// Names of the entries of `directory` holding ".tmp" (the toolkit's
// temporary files), joined by blanks.
std::string TemporaryFilesIn(const std::string& directory);

#endif  // ORVA_TESTS_TOOLKIT_TOOLKIT_TEST_UTIL_H_
