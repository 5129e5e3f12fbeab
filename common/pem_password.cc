#include "common/pem_password.h"

int RefusePemPassword(char*, int, int, void*) { return -1; }
