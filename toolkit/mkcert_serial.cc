// The serial number file of the local CA.

#include <dirent.h>
#include <net/if.h>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string>
#include <vector>

#include "common/log.h"
#include "common/raii.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"
#include "toolkit/store_file.h"

namespace {

constexpr char kNetworkInterfaces[] = "/sys/class/net";

// The first word of the device's MAC address file, at most 31 characters.
bool ReadMacAddressFile(std::string* word) {
  FilePtr file(std::fopen(OrvaPath(kMacAddressPath).c_str(), "r"));
  if (!file) return false;
  char buffer[32] = {0};
  if (std::fscanf(file.get(), "%31s", buffer) != 1) buffer[0] = '\0';
  *word = buffer;
  return true;
}

// The first line of a small system file, without its line end.
std::string ReadFirstLine(const std::string& path) {
  FilePtr file(std::fopen(path.c_str(), "r"));
  char buffer[64] = {0};
  if (!file || std::fgets(buffer, sizeof(buffer), file.get()) == nullptr) {
    return "";
  }
  std::string line(buffer);
  while (!line.empty() && std::isspace(static_cast<unsigned char>(line.back()))) {
    line.pop_back();
  }
  return line;
}

// "aa:bb:..." as upper-case hex digits without colons; empty when the text
// is not an address or is all zeros.
std::string AddressDigits(const std::string& address) {
  std::string digits;
  bool all_zero = true;
  for (char c : address) {
    if (c == ':') continue;
    if (!std::isxdigit(static_cast<unsigned char>(c))) return "";
    if (c != '0') all_zero = false;
    digits += static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  }
  return all_zero ? "" : digits;
}

// Where the device's MAC address file is missing, the address of the
// machine's first non-loopback interface (by name) stands in for it.
bool ReadInterfaceAddress(std::string* word) {
  DirPtr directory(opendir(kNetworkInterfaces));
  if (!directory) return false;
  std::vector<std::string> names;
  while (struct dirent* entry = readdir(directory.get())) {
    if (entry->d_name[0] != '.') names.push_back(entry->d_name);
  }
  std::sort(names.begin(), names.end());
  for (const std::string& name : names) {
    std::string base = std::string(kNetworkInterfaces) + "/" + name;
    unsigned long flags =
        std::strtoul(ReadFirstLine(base + "/flags").c_str(), nullptr, 0);
    if (flags & IFF_LOOPBACK) continue;
    std::string digits = AddressDigits(ReadFirstLine(base + "/address"));
    if (digits.empty()) continue;
    *word = digits.substr(0, 31);
    return true;
  }
  return false;
}

}  // namespace

int genSerial() {
  std::string mac;
  if (!ReadMacAddressFile(&mac) && !ReadInterfaceAddress(&mac)) {
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
