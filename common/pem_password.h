#ifndef ORVA_COMMON_PEM_PASSWORD_H_
#define ORVA_COMMON_PEM_PASSWORD_H_

// Password callback for the OpenSSL PEM readers that supplies no password,
// so an encrypted block fails to load instead of prompting on a terminal.
// Pass it wherever a PEM reader takes a callback.
int RefusePemPassword(char* buffer, int size, int rwflag, void* userdata);

#endif  // ORVA_COMMON_PEM_PASSWORD_H_
