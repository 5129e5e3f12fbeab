#ifndef ORVA_TOOLKIT_CSR_ARGUMENT_H_
#define ORVA_TOOLKIT_CSR_ARGUMENT_H_

#include <string>

// The subject of a certificate request. The record enforces nothing; request
// generation decides what it accepts.
typedef struct _tag_CSR_ARGUMENT {
  std::string country;
  std::string state;
  std::string city;
  std::string organization;
  std::string department;
  std::string common_name;
  std::string email;
} CSR_ARGUMENT;

#endif  // ORVA_TOOLKIT_CSR_ARGUMENT_H_
