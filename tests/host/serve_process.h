#ifndef ORVA_TESTS_HOST_SERVE_PROCESS_H_
#define ORVA_TESTS_HOST_SERVE_PROCESS_H_

#include <sys/types.h>

#include <httplib.h>
#include <json/json.h>

#include <functional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "tests/support/test_support.h"

inline constexpr char kListQuery[] = "/webapi?api=ORVA.Core.Certificate&method=list";

// A real "orva-webapi serve" on loopback for one test, with its nginx:
// started on free ports with the test module loaded, and stopped (SIGTERM,
// then SIGKILL for both) when the object goes away, whatever the test did. Its standard output and
// error go to files in the device root, its temporary uploads to
// `UploadFolder()`.
class ServeProcess {
 public:
  // Starts the server on `root` (a device root made by init), with
  // `web` as its page folder when given, and waits until it has printed
  // its URLs and token line. started() tells whether it did.
  explicit ServeProcess(const std::string& root, const std::string& web = "");
  ~ServeProcess();

  ServeProcess(const ServeProcess&) = delete;
  ServeProcess& operator=(const ServeProcess&) = delete;

  bool started() const { return http_port_ > 0; }
  int http_port() const { return http_port_; }
  int https_port() const { return https_port_; }  // 0 when HTTPS is not up
  std::string UploadFolder() const { return root_ + "/uploads"; }

  // A client of the HTTP listener that sends the device root's token.
  httplib::Client AuthorizedClient() const;
  std::string Token() const;

  // Sends `signalNumber` and waits up to 10 s for the exit. Returns the
  // exit status, or -1 when the server was killed or had to be.
  int Stop(int signalNumber);

  // nginx's master process (0 when it has none).
  pid_t NginxPid() const;
  // The proportional set size, in KiB, of the server and every nginx
  // process: pages that nginx's master and workers share count once.
  long MemoryKib() const;

  std::string Output() const;  // standard output so far
  std::string Log() const;     // standard error (the syslog copy) so far

 private:
  std::string root_;
  pid_t pid_ = -1;
  int http_port_ = 0;
  int https_port_ = 0;
};

// Starts `words` (the first a full path) with its standard output in the
// file `out` and its standard error in `err`, which may be the same file.
// The child dies with the test. Returns its pid, -1 when fork failed.
pid_t StartProcess(std::vector<std::string> words, const std::string& out,
                   const std::string& err);

// Tests with a device root made by init.
class ServeTest : public testing::Test {
 protected:
  void SetUp() override;
  TempDeviceRoot scratch_;
};

// Polls `done` every 10 ms for up to `seconds`; true once it holds.
bool WaitFor(const std::function<bool()>& done, int seconds = 10);

// The number of files in `folder` (-1 when it cannot be read).
int CountFiles(const std::string& folder);

// The subjects of the certificates that a new TLS handshake with
// 127.0.0.1:PORT presents, leaf first, one "CN = name" line each; "" when
// the handshake fails. `options` are further options of "openssl s_client".
std::string PresentedSubjects(int port, const std::string& options = "");

// A TCP connection to 127.0.0.1:PORT that has sent `request` as it stands
// (nothing when it could not connect).
class RawConnection {
 public:
  RawConnection(int port, const std::string& request);
  ~RawConnection();
  RawConnection(const RawConnection&) = delete;
  RawConnection& operator=(const RawConnection&) = delete;

  // Everything the server sent until it closed the connection or went
  // quiet for a second (for `firstReplyMs` before its first byte).
  std::string Reply(int firstReplyMs = 1000);

 private:
  int fd_ = -1;
};

// The reply to `request` sent on a new connection.
std::string RawExchange(int port, const std::string& request);
// The HTTP status of a raw response ("HTTP/1.1 404 ..."), or 0.
int RawStatus(const std::string& response);

// The multipart form of an import of the certificate, key and chain texts.
httplib::MultipartFormDataItems ImportForm(const std::string& cert, const std::string& key,
                                           const std::string& chain);

// `text` parsed as JSON (null when it is not JSON).
Json::Value ParseJson(const std::string& text);

#endif  // ORVA_TESTS_HOST_SERVE_PROCESS_H_
