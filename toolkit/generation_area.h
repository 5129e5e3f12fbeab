#ifndef ORVA_TOOLKIT_GENERATION_AREA_H_
#define ORVA_TOOLKIT_GENERATION_AREA_H_

#include <string>

// The generation area "/usr/orva/etc/ssl/.gen" holds what waits to be
// handed out once: a pending key and request, a signed certificate.

// Makes the generation area with mode 0700 when it is missing (one level,
// its parent must exist); an existing one is given mode 0700 when it has
// another. Returns false (errno set) when it cannot be made, is not a
// folder or its mode cannot be set.
bool MakeGenerationArea();

// A path in the generation area under the device root for work in progress
// named `name` (for example ".new-server.key"); such files are removed or
// renamed before the request ends.
std::string GenerationWorkPath(const char* name);

#endif  // ORVA_TOOLKIT_GENERATION_AREA_H_
