#include "tests/host/serve_process.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <iterator>
#include <memory>
#include <sstream>
#include <thread>
#include <vector>

#include "host/device_root_init.h"

ServeProcess::ServeProcess(const std::string& root, const std::string& web) : root_(root) {
  MakeDirs(UploadFolder());
  // Uploads go where TMPDIR points; env sets it for the server alone.
  std::vector<std::string> words = {"/usr/bin/env", "TMPDIR=" + UploadFolder(),
                                    ORVA_WEBAPI_PATH, "serve", "--root", root,
                                    "--listen", "127.0.0.1:0", "--listen-https",
                                    "127.0.0.1:0", "--module", ORVA_TEST_MODULE_PATH};
  if (!web.empty()) words.insert(words.end(), {"--web", web});
  // The output of a server started before on this root is not this one's.
  unlink((root_ + "/serve.out").c_str());
  pid_ = StartProcess(words, root_ + "/serve.out", root_ + "/serve.err");
  // The token line comes last, once both listeners are set up.
  WaitFor([this] {
    int status;
    if (pid_ > 0 && waitpid(pid_, &status, WNOHANG) == pid_) pid_ = -1;
    return pid_ <= 0 || Output().find("\ntoken: ") != std::string::npos;
  });
  const std::string output = pid_ > 0 ? Output() : "";
  auto port_after = [&](const std::string& text) {
    const std::string::size_type at = output.find(text);
    return at == std::string::npos ? 0 : std::atoi(output.c_str() + at + text.size());
  };
  http_port_ = port_after("\nhttp:  http://127.0.0.1:");
  https_port_ = port_after("\nhttps: https://127.0.0.1:");
}

ServeProcess::~ServeProcess() { Stop(SIGTERM); }

int ServeProcess::Stop(int signalNumber) {
  if (pid_ <= 0) return -1;
  kill(pid_, signalNumber);
  int status = 0;
  const bool exited = WaitFor([&] { return waitpid(pid_, &status, WNOHANG) == pid_; });
  if (!exited) {
    if (NginxPid() > 0) kill(-NginxPid(), SIGKILL);
    kill(pid_, SIGKILL);
    waitpid(pid_, &status, 0);
  }
  pid_ = -1;
  return exited && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

std::string ServeProcess::Token() const {
  std::string token = ReadFile(TokenPath(root_));
  return token.substr(0, token.find('\n'));
}

httplib::Client ServeProcess::AuthorizedClient() const {
  httplib::Client client("127.0.0.1", http_port_);
  client.set_bearer_token_auth(Token());
  // A call that changes the store waits for the calls before it.
  client.set_read_timeout(120);
  return client;
}

pid_t ServeProcess::NginxPid() const {
  return std::atoi(ReadFile(root_ + "/usr/orva/var/webapi/nginx.pid").c_str());
}

long ServeProcess::MemoryKib() const {
  auto proportional_kib = [](const std::string& pid) {
    const std::string rollup = ReadFile("/proc/" + pid + "/smaps_rollup");
    const std::string::size_type at = rollup.find("\nPss:");
    return at == std::string::npos ? 0L : std::atol(rollup.c_str() + at + 5);
  };
  // nginx's workers are the children of its master.
  const std::string nginx = std::to_string(NginxPid());
  long kib = proportional_kib(std::to_string(pid_)) + proportional_kib(nginx);
  std::istringstream workers(ReadFile("/proc/" + nginx + "/task/" + nginx + "/children"));
  for (std::string worker; workers >> worker;) kib += proportional_kib(worker);
  return kib;
}

std::string ServeProcess::Output() const { return ReadFile(root_ + "/serve.out"); }
std::string ServeProcess::Log() const { return ReadFile(root_ + "/serve.err"); }

pid_t StartProcess(std::vector<std::string> words, const std::string& out,
                   const std::string& err) {
  std::vector<char*> argv;
  for (std::string& word : words) argv.push_back(&word[0]);
  argv.push_back(nullptr);
  const pid_t pid = fork();
  if (pid == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);  // Never outlive a crashed test.
    const int out_fd = open(out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    const int err_fd = err == out ? out_fd : open(err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    if (out_fd >= 0 && err_fd >= 0 && dup2(out_fd, STDOUT_FILENO) >= 0 &&
        dup2(err_fd, STDERR_FILENO) >= 0) {
      execv(argv[0], argv.data());
    }
    _exit(127);
  }
  return pid;
}

void ServeTest::SetUp() {
  // nginx's workers run as nobody when the tests run as root.
  chmod(scratch_.root().c_str(), 0755);
  std::string error;
  ASSERT_TRUE(InitDeviceRoot(scratch_.root(), &error)) << error;
}

bool WaitFor(const std::function<bool()>& done, int seconds) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
  while (!done()) {
    if (std::chrono::steady_clock::now() > deadline) return false;
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  return true;
}

int CountFiles(const std::string& folder) {
  std::error_code error;
  std::filesystem::directory_iterator entries(folder, error);
  return error ? -1 : static_cast<int>(std::distance(entries, {}));
}

std::string PresentedSubjects(int port, const std::string& options) {
  // The tool lists the chain it was sent as lines " N s:SUBJECT".
  const std::string command = "openssl s_client -connect 127.0.0.1:" + std::to_string(port) +
                              " " + options + " </dev/null 2>/dev/null";
  std::unique_ptr<FILE, int (*)(FILE*)> tool(popen(command.c_str(), "r"), pclose);
  std::string subjects;
  char line[4096];
  while (tool && std::fgets(line, sizeof(line), tool.get()) != nullptr) {
    int number, subject_at = 0;
    if (std::sscanf(line, " %d s:%n", &number, &subject_at) == 1 && subject_at > 0) {
      subjects += line + subject_at;
    }
  }
  return subjects;
}

RawConnection::RawConnection(int port, const std::string& request)
    : fd_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  if (fd_ >= 0 &&
      (connect(fd_, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0 ||
       send(fd_, request.data(), request.size(), MSG_NOSIGNAL) !=
           static_cast<ssize_t>(request.size()))) {
    close(fd_);
    fd_ = -1;
  }
}

RawConnection::~RawConnection() {
  if (fd_ >= 0) close(fd_);
}

std::string RawConnection::Reply(int firstReplyMs) {
  std::string response;
  pollfd waiting{fd_, POLLIN, 0};
  char buffer[4096];
  while (fd_ >= 0 && poll(&waiting, 1, response.empty() ? firstReplyMs : 1000) > 0) {
    ssize_t got = recv(fd_, buffer, sizeof(buffer), 0);
    if (got <= 0) break;
    response.append(buffer, static_cast<size_t>(got));
  }
  return response;
}

std::string RawExchange(int port, const std::string& request) {
  return RawConnection(port, request).Reply();
}

int RawStatus(const std::string& response) {
  return response.rfind("HTTP/1.1 ", 0) == 0 ? std::atoi(response.c_str() + 9) : 0;
}

httplib::MultipartFormDataItems ImportForm(const std::string& cert, const std::string& key,
                                           const std::string& chain) {
  return {{"api", "ORVA.Core.Certificate", "", ""},
          {"method", "import", "", ""},
          {"cert", cert, "server.crt", ""},
          {"key", key, "server.key", ""},
          {"inter_cert", chain, "chain.crt", ""}};
}

Json::Value ParseJson(const std::string& text) {
  Json::Value value;
  std::istringstream stream(text);
  Json::CharReaderBuilder builder;
  std::string errors;
  return Json::parseFromStream(builder, stream, &value, &errors) ? value : Json::Value();
}
