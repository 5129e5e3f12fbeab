// The serial number file of the local CA.

#include <cstdio>
#include <ctime>
#include <string>

#include "common/file_util.h"
#include "common/log.h"
#include "common/raii.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"
#include "toolkit/store_file.h"

namespace {

// The first word of the device's MAC address file, at most 31 characters.
bool ReadMacAddressFile(std::string* word) {
  FilePtr file(std::fopen(OrvaPath(kMacAddressPath).c_str(), "r"));
  if (!file) return false;
  char buffer[32] = {0};
  if (std::fscanf(file.get(), "%31s", buffer) != 1) buffer[0] = '\0';
  *word = buffer;
  return true;
}

}  // namespace

int genSerial() {
  std::string mac;
  // Where the device's MAC address file is missing, the machine's first
  // network interface stands in for it.
  if (!ReadMacAddressFile(&mac) && (mac = FirstInterfaceMacAddress()).empty()) {
    ORVA_LOG("Open /proc/sys/kernel/orva_mac_address1 failed");
    return -1;
  }
  std::string serial = std::to_string(static_cast<long long>(std::time(nullptr)));
  if (mac.size() > 8) serial += mac.substr(8);
  if (serial.size() > 31) serial.resize(31);
  if (serial.size() % 2 != 0) serial += '1';

  std::string path = OrvaPath(kSerialPath);
  int written = WriteTextFile(path, serial);
  if (written == -1) {
    ORVA_LOG("Open /usr/orva/etc/ssl/.mkcert.serial failed");
    return -1;
  }
  if (written != 0) {
    // A cut serial file would stop every later signing, and the file is
    // only made when absent: leave none.
    std::remove(path.c_str());
    ORVA_LOG_LASTERR("Write /usr/orva/etc/ssl/.mkcert.serial failed");
    return -1;
  }
  return 0;
}
