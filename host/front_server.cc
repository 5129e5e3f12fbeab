#include "host/front_server.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <thread>
#include <utility>

#include "common/file_util.h"
#include "common/log.h"
#include "common/shell_command.h"
#include "common/store_paths.h"
#include "platform/olib/olib_process.h"
#include "platform/olib/orva_conf.h"
#include "platform/olib/orva_root.h"

namespace {

// The machine's nginx, like the base commands: not the device's.
constexpr char kNginxProgram[] = "/usr/sbin/nginx";
constexpr char kFrontFolder[] = "/usr/orva/var/webapi";
constexpr char kCheckFolder[] = "check";  // where a configuration is tested
constexpr auto kStopWait = std::chrono::seconds(10);

bool HttpsWanted() { return OrvaConf().Info("runHTTPS", "") == "yes"; }

// Polls `done` every 10 ms until it holds (true) or `wait` has passed.
template <typename Done>
bool PollFor(std::chrono::steady_clock::duration wait, Done done) {
  const auto deadline = std::chrono::steady_clock::now() + wait;
  while (!done()) {
    if (std::chrono::steady_clock::now() > deadline) return false;
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  return true;
}

// Replaces `path` with `text`, readable by its owner only.
bool WritePrivateFile(const std::string& path, const std::string& text) {
  unlink(path.c_str());
  int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600);
  if (fd < 0) return false;
  const bool written = WriteAll(fd, text.data(), text.size());
  return close(fd) == 0 && written;
}

// Copies the store's certificate, followed by its intermediate
// certificates, and its key into `tls`.
bool CopyStorePair(const std::string& tls, std::string* problem) {
  std::string certificate, key;
  if (!ReadWholeFile(OrvaPath(kServerCrtPath), &certificate) ||
      !ReadWholeFile(OrvaPath(kServerKeyPath), &key)) {
    *problem = "the store has no server certificate and key";
    return false;
  }
  std::string chain;
  if (ReadWholeFile(OrvaPath(kInterCrtPath), &chain) && !certificate.empty() &&
      certificate.back() != '\n') {
    certificate += '\n';
  }
  if (!WritePrivateFile(tls + "/server.pem", certificate + chain) ||
      !WritePrivateFile(tls + "/server.key", key)) {
    *problem = "cannot copy the store's pair into " + tls;
    return false;
  }
  return true;
}

}  // namespace

FrontServer::FrontServer(FrontSettings settings, CallOrder* store_order)
    : settings_(std::move(settings)), store_order_(store_order) {}

FrontServer::~FrontServer() { Stop(); }

std::string FrontServer::Folder() { return OrvaPath(kFrontFolder); }

bool FrontServer::Stage(bool withHttps, std::string* problem) {
  const std::string check = Folder() + "/" + kCheckFolder;
  if (withHttps) {
    CallOrder::Turn whole_set(store_order_);
    if (!CopyStorePair(check + "/tls", problem)) return false;
  }
  FrontSettings settings = settings_;
  settings.with_https = withHttps;
  if (!WritePrivateFile(check + "/nginx.conf", FrontConfig(settings))) {
    *problem = "cannot write " + check + "/nginx.conf";
    return false;
  }
  ShellCommand test(RootedCommandSize(256));
  test.Append("%s -t -q -p %s -c %s/nginx.conf -e error.log",
              {kNginxProgram, Folder() + "/", kCheckFolder});
  if (RunShellCommand(test) != 0) {
    *problem = withHttps ? "nginx does not load the store's server certificate and key"
                         : "nginx refuses its configuration";
    return false;
  }
  return true;
}

bool FrontServer::Promote(bool withHttps) {
  const std::string folder = Folder();
  const std::string check = folder + "/" + kCheckFolder;
  bool moved = true;
  if (withHttps) {
    for (const char* file : {"/tls/server.pem", "/tls/server.key"}) {
      moved = moved && rename((check + file).c_str(), (folder + file).c_str()) == 0;
    }
  }
  return moved && rename((check + "/nginx.conf").c_str(), (folder + "/nginx.conf").c_str()) == 0;
}

bool FrontServer::Start(std::string* error) {
  const std::string folder = Folder();
  for (const char* sub : {"/tmp", "/tls", "/check/tls"}) {
    if (!MakeDirectories(folder + sub)) {
      *error = "cannot make " + folder + sub;
      return false;
    }
  }
  // The folders of key copies are the owner's alone; nginx's workers (maybe
  // another user) must reach its temporary files.
  chmod(folder.c_str(), 0755);
  chmod((folder + "/tls").c_str(), 0700);
  chmod((folder + "/" + kCheckFolder).c_str(), 0700);
  const std::string pid_file = folder + "/nginx.pid";
  unlink(pid_file.c_str());

  std::string problem;
  const bool wanted = HttpsWanted();
  bool with_https = wanted;
  if (with_https && !Stage(true, &problem)) {
    ORVA_LOG("HTTPS is down: %s", problem.c_str());
    with_https = false;
  }
  if ((!with_https && !Stage(false, &problem)) || !Promote(with_https)) {
    *error = problem.empty() ? "cannot write the configuration in " + folder : problem;
    return false;
  }
  https_ = with_https ? Https::kUp : wanted ? Https::kDown : Https::kOff;

  const std::string prefix = folder + "/";
  const char* const argv[] = {kNginxProgram, "-p", prefix.c_str(), "-c", "nginx.conf",
                              "-e", "error.log", nullptr};
  pid_ = OLIBProcessSpawn(argv, nullptr);
  if (pid_ <= 0) {
    *error = std::string("cannot start ") + kNginxProgram;
    return false;
  }
  // nginx writes its pid file once its ports are bound.
  int status = 0;
  const std::string pid_text = std::to_string(pid_) + "\n";
  const bool listening = PollFor(kStopWait, [&] {
    std::string written;
    return Ended(&status) || (ReadWholeFile(pid_file, &written) && written == pid_text);
  });
  if (pid_ < 0 || !listening) {
    *error = "nginx did not start (see " + folder + "/error.log)";
    Stop();
    return false;
  }
  return true;
}

FrontServer::Certificate FrontServer::Reload() {
  std::lock_guard<std::mutex> lock(reload_mutex_);
  const bool with_https = HttpsWanted();
  std::string problem;
  const pid_t pid = pid_;
  if (!Stage(with_https, &problem) || !Promote(with_https) || pid <= 0 ||
      kill(pid, SIGHUP) != 0) {
    ORVA_LOG("HTTPS %s: %s", https_ == Https::kUp ? "keeps the previous certificate" : "is down",
             problem.empty() ? "nginx cannot be reloaded" : problem.c_str());
    return Certificate::kPrevious;
  }
  https_ = with_https ? Https::kUp : Https::kOff;
  return with_https ? Certificate::kNew : Certificate::kNone;
}

bool FrontServer::Ended(int* status) {
  const pid_t pid = pid_;
  if (pid <= 0 || waitpid(pid, status, WNOHANG) != pid) return false;
  // The workers are in nginx's process group; one left behind by a master
  // that was killed would hold the ports.
  kill(-pid, SIGKILL);
  pid_ = -1;
  return true;
}

void FrontServer::Stop() {
  const pid_t pid = pid_;
  if (pid <= 0) return;
  int status = 0;
  kill(pid, SIGQUIT);
  if (!PollFor(kStopWait, [&] { return Ended(&status); })) {
    kill(-pid, SIGKILL);
    waitpid(pid, &status, 0);
    pid_ = -1;
  }
}
