#ifndef ORVA_PLATFORM_OLIB_ORVA_ROOT_H_
#define ORVA_PLATFORM_OLIB_ORVA_ROOT_H_

#include <string>

// Places a fixed absolute device path under the device root.
//
// The device root is taken from the environment variable ORVA_ROOT on every
// call; unset or empty means "/", the device itself. `devicePath` must be an
// absolute path such as "/usr/orva/etc/ssl/ssl.crt/server.crt". The result is
// the root followed by the path, with no doubled slash. Every fixed path the
// system names goes through this function, so a test can run in a private
// root and never touch the real machine.
std::string OrvaPath(const std::string& devicePath);

#endif  // ORVA_PLATFORM_OLIB_ORVA_ROOT_H_
