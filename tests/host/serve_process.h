#ifndef ORVA_TESTS_HOST_SERVE_PROCESS_H_
#define ORVA_TESTS_HOST_SERVE_PROCESS_H_

#include <sys/types.h>

#include <httplib.h>
#include <json/json.h>

#include <string>
#include <vector>

// A real "orva-webapi serve" on loopback for one test: started on free
// ports with the test module loaded, and stopped (SIGTERM, then SIGKILL)
// when the object goes away, whatever the test did. The server's standard
// output and error go to files in the device root, its temporary uploads
// to `UploadFolder()`.
class ServeProcess {
 public:
  // Starts the server on `root` (a device root made by init) with
  // `arguments` added to the command line, and waits until it has printed
  // its URLs. started() tells whether it did.
  ServeProcess(const std::string& root, const std::vector<std::string>& arguments = {});
  ~ServeProcess();

  ServeProcess(const ServeProcess&) = delete;
  ServeProcess& operator=(const ServeProcess&) = delete;

  bool started() const { return http_port_ > 0; }
  int http_port() const { return http_port_; }
  // 0 when the server printed no HTTPS URL.
  int https_port() const { return https_port_; }
  std::string UploadFolder() const { return root_ + "/uploads"; }

  // A client of the HTTP listener that sends the device root's token.
  httplib::Client AuthorizedClient() const;
  std::string Token() const;

  // Sends `signalNumber` and waits up to 10 s for the exit. Returns the
  // exit status, or -1 when the server was killed or had to be.
  int Stop(int signalNumber);

  std::string Output() const;  // standard output so far
  std::string Log() const;     // standard error (the syslog copy) so far
  // The server's resident set size in KiB, or -1.
  long ResidentKib() const;

 private:
  std::string root_;
  pid_t pid_ = -1;
  int http_port_ = 0;
  int https_port_ = 0;
};

// The number of files in `folder` (-1 when it cannot be read).
int CountFiles(const std::string& folder);

// Sends `request` as it stands to 127.0.0.1:PORT over plain TCP and returns
// everything the server sent until it closed the connection or went quiet
// for a second (for `firstReplyMs` before its first byte).
std::string RawExchange(int port, const std::string& request, int firstReplyMs = 1000);

// The HTTP status of a raw response ("HTTP/1.1 404 ..."), or 0.
int RawStatus(const std::string& response);

// The multipart form of an import of the certificate, key and chain texts.
httplib::MultipartFormDataItems ImportForm(const std::string& cert, const std::string& key,
                                           const std::string& chain);

// The host's answer to a request it refuses with HTTP status `code`.
Json::Value HostError(int code);

// `text` parsed as JSON (null when it is not JSON).
Json::Value ParseJson(const std::string& text);

// A port on 127.0.0.1 that was free a moment ago.
int FreeLoopbackPort();

#endif  // ORVA_TESTS_HOST_SERVE_PROCESS_H_
