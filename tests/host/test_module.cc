// A web-API module for the host's tests, loaded with "serve --module". Its
// methods do what the certificate module's cannot be made to do on demand:
// echo, offer a download of a missing file, answer nothing, throw, and ask
// for a web server restart.

#include <fstream>
#include <stdexcept>

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

constexpr int kRows = 5;
// As many rows as a host reads from a module that gives no count; those
// past kRows must never be served.
const ORVA::APIEntry kTable[kDefaultApiTableSize] = {
    {"ORVA.Test", 1, "download", OfferMissingDownload},
    {"ORVA.Test", 1, "silent", AnswerNothing},
    {"ORVA.Test", 1, "throws", Throw},
    {"ORVA.Test", 1, "echo", Echo},
    {"ORVA.Test", 1, "restart", AskForRestart},
    {"ORVA.Test", 1, "beyond", AskForRestart},
    {"ORVA.Test", 1, "beyond", AskForRestart},
};

}  // namespace

extern "C" const ORVA::APIEntry* GetAPITable() { return kTable; }
extern "C" int GetAPITableSize() { return kRows; }
