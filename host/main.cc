// orva-webapi: provisions a device root, calls a certificate method from the
// command line, and serves the methods over HTTP and HTTPS.

#include <syslog.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "common/file_util.h"
#include "host/api_call.h"
#include "host/device_root_init.h"
#include "host/listen_address.h"
#include "host/module_loader.h"
#include "host/renewal_schedule.h"
#include "host/serve_command.h"
#include "host/temporary_uploads.h"

namespace {

constexpr char kUsage[] =
    "usage:\n"
    "  orva-webapi init  --root DIR\n"
    "  orva-webapi call  --root DIR API METHOD [name=value ...] "
    "[--upload NAME=PATH ...] [--output FILE]\n"
    "  orva-webapi renew --root DIR\n"
    "  orva-webapi serve --root DIR [--listen HOST:PORT] "
    "[--listen-https HOST:PORT] [--web DIR] [--module PATH ...]\n";

int Usage() {
  std::fputs(kUsage, stderr);
  return 2;
}

int RunInit(const std::string& root) {
  std::string error;
  if (root.empty()) return Usage();
  if (!InitDeviceRoot(root, &error)) {
    std::fprintf(stderr, "orva-webapi: init failed: %s\n", error.c_str());
    return 1;
  }
  std::printf("device root ready: %s\naccess token: %s\n", root.c_str(),
              TokenPath(root).c_str());
  return 0;
}

struct CallArguments {
  std::string api;
  std::string method;
  Json::Value params{Json::objectValue};
  std::vector<std::pair<std::string, std::string>> uploads;  // name, path
  std::string output;
  // A method that no module has is told in words (the command needs it),
  // instead of being answered 404 like a request.
  bool needs_method = false;
};

bool SplitPair(const std::string& text, std::string* name, std::string* value) {
  std::string::size_type equals = text.find('=');
  if (equals == std::string::npos || equals == 0) return false;
  *name = text.substr(0, equals);
  *value = text.substr(equals + 1);
  return true;
}

int PrintOutcome(const CallOutcome& outcome, const std::string& output) {
  if (!outcome.is_download) {
    std::printf("%s\n", ToOneLineJson(outcome.answer).c_str());
    return outcome.success ? 0 : 1;
  }
  std::string path = output.empty() ? OfferedFileName(outcome.download) : output;
  if (path.empty()) path = "download.bin";
  std::ofstream file(path, std::ios::binary | std::ios::trunc);
  file.write(outcome.download.body.data(),
             static_cast<std::streamsize>(outcome.download.body.size()));
  file.close();
  if (!file) {
    std::fprintf(stderr, "orva-webapi: cannot write %s\n", path.c_str());
    return 1;
  }
  Json::Value written(Json::objectValue);
  written["success"] = true;
  written["download"] = path;
  written["bytes"] = static_cast<Json::UInt64>(outcome.download.body.size());
  std::printf("%s\n", ToOneLineJson(written).c_str());
  return 0;
}

int RunCall(const std::string& root, const CallArguments& arguments) {
  std::string absolute_root;
  if (!UseDeviceRoot(root, &absolute_root)) {
    std::fprintf(stderr, "orva-webapi: no device root at %s (run init)\n",
                 root.c_str());
    return 1;
  }
  for (const std::string& name : arguments.params.getMemberNames()) {
    if (IsHostOnlyParameter(name)) {
      std::printf("%s\n", ToOneLineJson(HostFailure(400).answer).c_str());
      return 1;
    }
  }
  ModuleSet modules;
  std::string error;
  if (!modules.Load({}, &error)) {
    std::fprintf(stderr, "orva-webapi: %s\n", error.c_str());
    return 1;
  }
  const ORVA::APITable* serving =
      FindServingTable(modules.tables(), arguments.api, arguments.method, 1);
  if (serving == nullptr && arguments.needs_method) {
    std::fprintf(stderr, "orva-webapi: no loaded module has the method %s %s (version 1): "
                 "the modules are older than this host\n",
                 arguments.api.c_str(), arguments.method.c_str());
    return 1;
  }
  const ORVA::APITable table = serving != nullptr ? *serving : ORVA::APITable();
  Json::Value params = arguments.params;
  TemporaryUploads uploads;
  for (const auto& upload : arguments.uploads) {
    std::string content;
    if (!ReadWholeFile(upload.second, &content)) {
      std::fprintf(stderr, "orva-webapi: cannot read %s\n", upload.second.c_str());
      return 1;
    }
    std::string client_name = upload.second.substr(upload.second.rfind('/') + 1);
    if (!uploads.Add(upload.first, content, client_name, &params)) {
      std::fprintf(stderr, "orva-webapi: cannot save the upload %s\n",
                   upload.first.c_str());
      return 1;
    }
  }
  openlog("orva-webapi", LOG_PERROR | LOG_PID, LOG_USER);
  CallOutcome outcome =
      CallApi(table, arguments.api, arguments.method, 1, params);
  return PrintOutcome(outcome, arguments.output);
}

// `orva-webapi renew`: the renewal check that serve runs, once, as a call.
int RunRenew(const std::string& root) {
  CallArguments renew;
  renew.api = kRenewalApi;
  renew.method = kRenewalMethod;
  renew.needs_method = true;
  return RunCall(root, renew);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) return Usage();
  std::string command = argv[1];
  std::string root;
  CallArguments call;
  ServeOptions serve;
  bool has_serve_options = false;
  bool has_call_options = false;
  std::vector<std::string> positional;
  for (int i = 2; i < argc; ++i) {
    std::string argument = argv[i];
    bool has_value = i + 1 < argc;
    if (argument == "--listen" || argument == "--listen-https" ||
        argument == "--web" || argument == "--module") {
      has_serve_options = true;
    } else if (argument == "--output" || argument == "--upload") {
      has_call_options = true;
    }
    if (argument == "--root" && has_value) {
      root = argv[++i];
    } else if (argument == "--output" && has_value) {
      call.output = argv[++i];
    } else if (argument == "--listen" && has_value) {
      if (!ParseListenAddress(argv[++i], &serve.http)) return Usage();
    } else if (argument == "--listen-https" && has_value) {
      if (!ParseListenAddress(argv[++i], &serve.https)) return Usage();
    } else if (argument == "--web" && has_value) {
      serve.web = argv[++i];
    } else if (argument == "--module" && has_value) {
      serve.modules.push_back(argv[++i]);
    } else if (argument == "--upload" && has_value) {
      std::string name, path;
      if (!SplitPair(argv[++i], &name, &path)) return Usage();
      call.uploads.emplace_back(name, path);
    } else if (argument.rfind("--", 0) == 0) {
      return Usage();
    } else {
      positional.push_back(argument);
    }
  }
  if ((has_serve_options && command != "serve") ||
      (has_call_options && command != "call")) {
    return Usage();
  }
  if (command == "init" && positional.empty()) return RunInit(root);
  if (command == "renew" && positional.empty() && !root.empty()) return RunRenew(root);
  if (command == "call" && positional.size() >= 2 && !root.empty()) {
    call.api = positional[0];
    call.method = positional[1];
    for (size_t i = 2; i < positional.size(); ++i) {
      std::string name, value;
      if (!SplitPair(positional[i], &name, &value)) return Usage();
      call.params[name] = value;
    }
    return RunCall(root, call);
  }
  if (command == "serve" && positional.empty() && !root.empty()) {
    serve.root = root;
    return RunServe(serve);
  }
  return Usage();
}
