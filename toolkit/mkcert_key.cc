// Directories and keys.

#include <unistd.h>

#include <string>

#include "common/file_util.h"
#include "common/log.h"
#include "common/shell_command.h"
#include "toolkit/key_strength.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"
#include "toolkit/store_file.h"

namespace {

// Beyond this size the tool only warns and may work for hours.
constexpr unsigned int kMaxKeyBits = 16384;

// Extra seed material for the tool. These are the machine's own files, not
// device paths; the tool refuses to run when one of them is missing, so only
// those that exist are handed on.
const char* const kSeedFiles[] = {
    "/var/log/messages", "/var/run/dmesg.boot", "/var/log/system.log",
    "/etc/hosts",        "/etc/group",          "/etc/resolv.conf",
    "/bin/ls",
};

// The existing seed files joined by ":"; empty when none exists.
std::string ExistingSeedFiles() {
  std::string list;
  for (const char* file : kSeedFiles) {
    if (access(file, F_OK) != 0) continue;
    if (!list.empty()) list += ':';
    list += file;
  }
  return list;
}

}  // namespace

int genDir(const char* path) {
  if (path == nullptr || *path == '\0') {
    ORVA_LOG("genDir sanity check failed");
    return -1;
  }
  return MakeDirectories(DirectoryOf(path)) ? 0 : -1;
}

int checkKeySize(unsigned int bits) {
  if (bits >= static_cast<unsigned int>(kMinRsaKeyBits) && bits <= kMaxKeyBits) return 0;
  ORVA_LOG("Key size %u refused: RSA keys have %d to %u bits", bits, kMinRsaKeyBits,
           kMaxKeyBits);
  return -1;
}

const char* EcCurveName(const KeyKind& kind) {
  if (kind.algorithm != KeyAlgorithm::kEc) return nullptr;
  if (kind.bits == 256) return "P-256";
  if (kind.bits == 384) return "P-384";
  return nullptr;
}

int checkKeyKind(const KeyKind& kind) {
  if (kind.algorithm == KeyAlgorithm::kRsa) {
    return kind.bits < 0 ? checkKeySize(0) : checkKeySize(static_cast<unsigned int>(kind.bits));
  }
  if (EcCurveName(kind) != nullptr) return 0;
  ORVA_LOG("EC key size %d refused: EC keys are made on P-256 or P-384", kind.bits);
  return -1;
}

int genKey(const char* keyPath, unsigned int bits) {
  if (keyPath == nullptr || *keyPath == '\0' || checkKeySize(bits) != 0) {
    ORVA_LOG("genKey sanity failed");
    return -1;
  }
  return genKeyOf(keyPath, {KeyAlgorithm::kRsa, static_cast<int>(bits)});
}

int genKeyOf(const char* keyPath, const KeyKind& kind) {
  if (keyPath == nullptr || *keyPath == '\0' || checkKeyKind(kind) != 0) {
    ORVA_LOG("genKey sanity failed");
    return -1;
  }
  if (genDir(keyPath) != 0) {
    ORVA_LOG("generate directory failed");
    return -1;
  }
  StoreFileSet set;
  const std::string key = set.Add(keyPath, StoreContent::kPrivateKey);
  if (key.empty()) return -1;

  std::string seeds = ExistingSeedFiles();
  ShellCommand command(RootedCommandSize(kToolkitCommandSize));
  if (kind.algorithm == KeyAlgorithm::kEc) {
    // An EC key takes a millisecond: the seed files add nothing to it.
    command.Append("%s genpkey -algorithm EC -pkeyopt ec_paramgen_curve:%s"
                   " -pkeyopt ec_param_enc:named_curve -out %s >/dev/null 2>&1",
                   {OpensslTool(), EcCurveName(kind), key});
  } else if (seeds.empty()) {
    command.Append("%s genrsa -out %s %d >/dev/null 2>&1",
                   {OpensslTool(), key, kind.bits});
  } else {
    command.Append("%s genrsa -rand %s -out %s %d >/dev/null 2>&1",
                   {OpensslTool(), seeds, key, kind.bits});
  }
  if (!ToolExitedCleanly(RunShellCommand(command))) {
    ORVA_LOG("Error when execute \"%s\"", command.line());
    return -1;
  }
  return set.Install();
}
