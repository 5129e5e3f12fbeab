// The compatibility verdict of "list" on certificates made outside the
// project by plain openssl, one fixture per verdict code, each installed
// where the device would hold it.

#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/test_support.h"

namespace {

const std::string kServer = "basicConstraints=critical,CA:false\nextendedKeyUsage=serverAuth\n";
const std::string kNamed = kServer + "subjectAltName=DNS:device.example\n";
const std::string kStrictCa =
    "basicConstraints=critical,CA:true\nkeyUsage=critical,keyCertSign\nsubjectKeyIdentifier=hash\n";
const std::string kByLocalCa = "-cert ca.crt -keyfile ca.key ";  // openssl ca options
const std::string kYear = kByLocalCa + "-days 365";

}  // namespace

// Which clients each code names is the table in api/compatibility.h; here
// every code must name some, and the clients are compared only where they
// depend on the certificate.
TEST(CompatibilityVerdict, NamesTheCodeOfEachFixture) {
  // The store file that holds each ("type" as "list" names it), its key
  // (rsa2048 or rsa1024), the options of openssl ca and the codes (with
  // the clients after a colon).
  const struct {
    const char *what, *type;
    std::string extensions;
    const char* key;
    std::string options, codes;
  } fixtures[] = {
      {"clean, valid for the longest Apple allows", "server_cert", kNamed, "rsa2048",
       kByLocalCa + "-days 825", ""},
      {"expired", "server_cert", kNamed, "rsa2048",
       kByLocalCa + "-startdate 20200101000000Z -enddate 20210101000000Z", "expired"},
      {"not yet valid", "server_cert", kNamed, "rsa2048",
       kByLocalCa + "-startdate 20990101000000Z -enddate 20990601000000Z", "not_yet_valid"},
      {"expires soon", "server_cert", kNamed, "rsa2048", kByLocalCa + "-days 10", "expires_soon"},
      {"common name not among the names", "server_cert",
       kServer + "subjectAltName=DNS:nas.example\n", "rsa2048", kYear,
       "name_missing: Chrome Firefox Safari iOS curl Python Go GnuTLS OpenSSL"},
      {"no names but the common name", "server_cert", kServer, "rsa2048", kYear,
       "name_missing: Chrome Firefox Safari iOS Go"},
      {"empty subjectAltName", "inter_cert", kStrictCa + "subjectAltName=email:copy\n", "rsa2048",
       kYear, "empty_names"},
      {"no extended key usage", "server_cert",
       "basicConstraints=CA:false\nsubjectAltName=DNS:device.example\n", "rsa2048", kYear,
       "no_server_auth"},
      {"client use only", "server_cert",
       "extendedKeyUsage=clientAuth\nsubjectAltName=DNS:device.example\n", "rsa2048", kYear,
       "no_server_auth"},
      {"826 days", "server_cert", kNamed, "rsa2048", kByLocalCa + "-days 826", "validity_too_long"},
      {"1024-bit key", "server_cert", kNamed, "rsa1024", kYear, "weak_key"},
      {"SHA-1 signature", "server_cert", kNamed, "rsa2048", kYear + " -md sha1", "weak_signature"},
      {"CA without critical constraints", "root_cert",
       "basicConstraints=CA:true\nkeyUsage=keyCertSign\n", "rsa2048",
       "-selfsign -keyfile rsa2048 -days 365", "ca_not_strict"},
      {"issued by a CA the device does not present", "server_cert", kNamed, "rsa2048",
       "-cert other.crt -keyfile other.key -days 365", "incomplete_chain"},
  };
  TempDeviceRoot root;
  const std::string dir = root.Path("/fixture/");
  ASSERT_TRUE(MakeSelfSignedCa(dir + "ca.key", dir + "ca.crt", "/CN=Local CA"));
  ASSERT_TRUE(MakeSelfSignedCa(dir + "other.key", dir + "other.crt", "/CN=Other CA"));
  ASSERT_TRUE(RunForTest("cd " + dir + " && openssl genpkey -algorithm RSA -out rsa2048 && "
                         "openssl genpkey -algorithm RSA -pkeyopt rsa_keygen_bits:1024 -out "
                         "rsa1024"));
  root.WriteFile("/fixture/ca.cnf", "[ca]\ndefault_ca=d\n[d]\ndatabase=index.txt\n"
                 "new_certs_dir=.\nrand_serial=yes\ndefault_md=sha256\npolicy=p\n"
                 "unique_subject=no\n[p]\ncommonName=supplied\n");
  for (const auto& f : fixtures) {
    SCOPED_TRACE(f.what);
    root.WriteFile("/fixture/ext", f.extensions);
    root.WriteFile("/fixture/index.txt", "");
    ASSERT_TRUE(RunForTest("cd " + dir + " && openssl req -new -key " + f.key +
                           " -subj /CN=device.example -out csr && openssl ca -batch -notext "
                           "-config ca.cnf -extfile ext -in csr -out crt " + f.options));
    const std::string type = f.type;
    root.WriteFile(kCaCrtPath, ReadFile(dir + (type == "root_cert" ? "crt" : "ca.crt")));
    root.WriteFile(type == "inter_cert" ? kInterCrtPath : kServerCrtPath, ReadFile(dir + "crt"));
    Json::Value params(Json::objectValue);
    params["type"] = type;
    params["additional"] = "[\"compatibility\"]";
    const Json::Value entry =
        CallMethod(doCertificateList_v1, params).response.data()["certificates"][0];
    std::string codes, clients;
    for (const Json::Value& problem : entry["compatibility"]) {
      codes += (codes.empty() ? "" : " ") + problem["code"].asString();
      EXPECT_FALSE(problem["clients"].empty()) << codes;
      for (const Json::Value& client : problem["clients"]) clients += " " + client.asString();
    }
    EXPECT_EQ(f.codes, f.codes.find(':') == std::string::npos ? codes : codes + ":" + clients);
  }
}
