#ifndef ORVA_PLATFORM_OLIB_ORVA_CONF_H_
#define ORVA_PLATFORM_OLIB_ORVA_CONF_H_

#include <map>
#include <string>

// Reader of the system configuration "/usr/orva/etc/orva.conf" under the
// device root: one setting per line, key="value" (the quotes may be left
// out); blank lines and lines starting with "#" are skipped. The file is
// read once, at construction; a missing or unreadable file has no settings.
class OrvaConf {
 public:
  OrvaConf();
  ~OrvaConf();

  OrvaConf(const OrvaConf&) = delete;
  OrvaConf& operator=(const OrvaConf&) = delete;

  // The value of `key`, or "" when it is not set. `fallback`, when not
  // null, is returned instead of "" for a key that is not set.
  std::string Info(const char* key, const char* fallback) const;

 private:
  std::map<std::string, std::string> settings_;
};

#endif  // ORVA_PLATFORM_OLIB_ORVA_CONF_H_
