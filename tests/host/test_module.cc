// A web-API module for the host's tests, loaded with "serve --module". Its
// methods do what the certificate module's cannot be made to do on demand:
// echo, offer a download of a missing file, answer nothing, throw, ask
// for a web server restart, and stand in for the renewal method.

#include <unistd.h>

#include <chrono>
#include <fstream>
#include <stdexcept>
#include <thread>

#include "platform/olib/orva_root.h"
#include "platform/webapi/api_download.h"
#include "platform/webapi/api_table.h"

namespace {

void OfferMissingDownload(ORVA::APIRequest*, ORVA::APIResponse* response) {
  response->SetEnableOutput(false);
  ORVA::APIDownload download;
  download.SetHeader("content-disposition", "attachment; filename=\"archive.zip\"");
  download.Output(OrvaPath("/missing.zip"));
}

void AnswerNothing(ORVA::APIRequest*, ORVA::APIResponse*) {}

void Throw(ORVA::APIRequest*, ORVA::APIResponse*) {
  throw std::runtime_error("handler failed");
}

// Answers the parameters as they arrived; given "mark", first writes the
// file it names, so a test sees that the call ran.
void Echo(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  if (request->HasParam("mark")) std::ofstream(request->GetParam("mark", "").asString());
  response->SetSuccess(request->params());
}

void AskForRestart(ORVA::APIRequest*, ORVA::APIResponse* response) {
  response->SetHttpdRestart(true);
  response->SetSuccess(true);
}

// Stands in for the second module's renewal method (loaded first, this row
// serves): appends "renew" to /renew.calls under the device root, holds the
// call while /renew.hold exists (for at most 20 s), and fails while
// /renew.fails exists.
void Renew(ORVA::APIRequest*, ORVA::APIResponse* response) {
  std::ofstream(OrvaPath("/renew.calls"), std::ios::app) << "renew\n";
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
  while (access(OrvaPath("/renew.hold").c_str(), F_OK) == 0 &&
         std::chrono::steady_clock::now() < deadline) {
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  if (access(OrvaPath("/renew.fails").c_str(), F_OK) == 0) {
    response->SetError(5501, Json::Value());
  } else {
    response->SetSuccess(Json::Value(Json::objectValue));
  }
}

constexpr int kRows = 6;
// As many rows as a host reads from a module that gives no count; those
// past kRows must never be served.
const ORVA::APIEntry kTable[kDefaultApiTableSize] = {
    {"ORVA.Test", 1, "download", OfferMissingDownload},
    {"ORVA.Test", 1, "silent", AnswerNothing},
    {"ORVA.Test", 1, "throws", Throw},
    {"ORVA.Test", 1, "echo", Echo},
    {"ORVA.Core.Certificate.ACME", 1, "renew", Renew},
    {"ORVA.Test", 1, "restart", AskForRestart},
    {"ORVA.Test", 1, "beyond", AskForRestart},
};

}  // namespace

extern "C" const ORVA::APIEntry* GetAPITable() { return kTable; }
extern "C" int GetAPITableSize() { return kRows; }
