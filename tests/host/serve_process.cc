#include "tests/host/serve_process.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <thread>

#include "host/device_root_init.h"
#include "tests/support/test_support.h"

namespace {

// The port of the line "LABEL URL" whose URL ends in ":PORT/", or 0.
int PortOnLine(const std::string& output, const std::string& label) {
  std::istringstream lines(output);
  std::string line;
  while (std::getline(lines, line)) {
    if (line.rfind(label, 0) != 0 || line.size() < 2 || line.back() != '/') continue;
    std::string::size_type colon = line.rfind(':');
    if (colon == std::string::npos) return 0;
    return std::atoi(line.substr(colon + 1).c_str());
  }
  return 0;
}

}  // namespace

ServeProcess::ServeProcess(const std::string& root,
                           const std::vector<std::string>& arguments)
    : root_(root) {
  MakeDirs(UploadFolder());
  // Uploads go where TMPDIR points; env sets it for the server alone.
  std::vector<std::string> words = {"/usr/bin/env", "TMPDIR=" + UploadFolder(),
                                    ORVA_WEBAPI_PATH, "serve", "--root", root,
                                    "--listen", "127.0.0.1:0", "--listen-https",
                                    "127.0.0.1:0", "--module", ORVA_TEST_MODULE_PATH};
  words.insert(words.end(), arguments.begin(), arguments.end());
  std::vector<char*> argv;
  for (std::string& word : words) argv.push_back(&word[0]);
  argv.push_back(nullptr);
  std::string out_path = root_ + "/serve.out";
  std::string err_path = root_ + "/serve.err";
  // A server started before on this root must not be taken for this one.
  unlink(out_path.c_str());
  unlink(err_path.c_str());

  pid_ = fork();
  if (pid_ == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);  // Never outlive a crashed test.
    int out = open(out_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    int err = open(err_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    if (out < 0 || err < 0 || dup2(out, STDOUT_FILENO) < 0 || dup2(err, STDERR_FILENO) < 0) {
      _exit(127);
    }
    execv(argv[0], argv.data());
    _exit(127);
  }
  if (pid_ < 0) return;
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  while (std::chrono::steady_clock::now() < deadline) {
    std::string output = Output();
    if (output.find("\ntoken: ") != std::string::npos) {
      http_port_ = PortOnLine(output, "http: ");
      https_port_ = PortOnLine(output, "https: ");
      return;
    }
    int status;
    if (waitpid(pid_, &status, WNOHANG) == pid_) {
      pid_ = -1;
      return;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
}

ServeProcess::~ServeProcess() {
  if (pid_ > 0) Stop(SIGTERM);
}

int ServeProcess::Stop(int signalNumber) {
  if (pid_ <= 0) return -1;
  kill(pid_, signalNumber);
  int status = 0;
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  while (waitpid(pid_, &status, WNOHANG) != pid_) {
    if (std::chrono::steady_clock::now() > deadline) {
      kill(pid_, SIGKILL);
      waitpid(pid_, &status, 0);
      pid_ = -1;
      return -1;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  pid_ = -1;
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

std::string ServeProcess::Token() const {
  std::string token = ReadFile(TokenPath(root_));
  while (!token.empty() && (token.back() == '\n' || token.back() == '\r')) token.pop_back();
  return token;
}

httplib::Client ServeProcess::AuthorizedClient() const {
  httplib::Client client("127.0.0.1", http_port_);
  client.set_bearer_token_auth(Token());
  client.set_read_timeout(30);
  return client;
}

std::string ServeProcess::Output() const { return ReadFile(root_ + "/serve.out"); }
std::string ServeProcess::Log() const { return ReadFile(root_ + "/serve.err"); }

long ServeProcess::ResidentKib() const {
  std::ifstream status("/proc/" + std::to_string(pid_) + "/status");
  std::string line;
  while (std::getline(status, line)) {
    if (line.rfind("VmRSS:", 0) == 0) return std::atol(line.c_str() + 6);
  }
  return -1;
}

int CountFiles(const std::string& folder) {
  std::error_code error;
  std::filesystem::directory_iterator entries(folder, error);
  return error ? -1 : static_cast<int>(std::distance(entries, {}));
}

namespace {

struct SocketCloser {
  explicit SocketCloser(int fd) : fd(fd) {}
  ~SocketCloser() {
    if (fd >= 0) close(fd);
  }
  int fd;
};

sockaddr_in Loopback(int port) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return address;
}

}  // namespace

std::string RawExchange(int port, const std::string& request, int firstReplyMs) {
  SocketCloser socket_fd(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
  sockaddr_in address = Loopback(port);
  if (socket_fd.fd < 0 ||
      connect(socket_fd.fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0) {
    return "";
  }
  if (send(socket_fd.fd, request.data(), request.size(), MSG_NOSIGNAL) !=
      static_cast<ssize_t>(request.size())) {
    return "";
  }
  std::string response;
  pollfd waiting{socket_fd.fd, POLLIN, 0};
  char buffer[4096];
  while (poll(&waiting, 1, response.empty() ? firstReplyMs : 1000) > 0) {
    ssize_t got = recv(socket_fd.fd, buffer, sizeof(buffer), 0);
    if (got <= 0) break;
    response.append(buffer, static_cast<size_t>(got));
  }
  return response;
}

int RawStatus(const std::string& response) {
  if (response.rfind("HTTP/1.1 ", 0) != 0) return 0;
  return std::atoi(response.c_str() + 9);
}

httplib::MultipartFormDataItems ImportForm(const std::string& cert, const std::string& key,
                                           const std::string& chain) {
  return {{"api", "ORVA.Core.Certificate", "", ""},
          {"method", "import", "", ""},
          {"cert", cert, "server.crt", "application/x-pem-file"},
          {"key", key, "server.key", "application/x-pem-file"},
          {"inter_cert", chain, "chain.crt", "application/x-pem-file"}};
}

Json::Value HostError(int code) {
  Json::Value answer(Json::objectValue);
  answer["success"] = false;
  answer["error"]["code"] = code;
  return answer;
}

Json::Value ParseJson(const std::string& text) {
  Json::CharReaderBuilder builder;
  std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value value;
  std::string errors;
  if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) {
    return Json::Value();
  }
  return value;
}

int FreeLoopbackPort() {
  SocketCloser socket_fd(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
  sockaddr_in address = Loopback(0);
  socklen_t length = sizeof(address);
  if (socket_fd.fd < 0 ||
      bind(socket_fd.fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0 ||
      getsockname(socket_fd.fd, reinterpret_cast<sockaddr*>(&address), &length) != 0) {
    return 0;
  }
  return ntohs(address.sin_port);
}
