// A web-API module for the host's tests, loaded with "serve --module". Its
// methods do what the certificate module's cannot be made to do on demand:
// echo what arrived, read an upload, offer a download, answer nothing,
// throw, hold the write lock, and ask for a web server restart.

#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <thread>

#include "host/api_call.h"
#include "platform/olib/orva_root.h"
#include "platform/webapi/api_download.h"
#include "platform/webapi/api_table.h"

namespace {

// Answers the parameters exactly as the handler received them.
void Echo(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  response->SetSuccess(request->params());
}

// Answers what the uploaded file "doc" holds and where it lies.
void ReadUpload(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  std::string path = request->GetParam("doc_tmp", "").asString();
  struct stat info;
  std::ifstream file(path, std::ios::binary);
  if (path.empty() || stat(path.c_str(), &info) != 0 || !file) {
    response->SetError(5501, Json::Value());
    return;
  }
  Json::Value data(Json::objectValue);
  data["path"] = path;
  data["mode"] = static_cast<int>(info.st_mode & 07777);
  data["name"] = request->GetParam("doc", Json::Value());
  // In hexadecimal: answers are UTF-8, the upload need not be.
  std::string hex;
  for (std::istreambuf_iterator<char> byte(file), end; byte != end; ++byte) {
    hex += "0123456789abcdef"[static_cast<unsigned char>(*byte) >> 4];
    hex += "0123456789abcdef"[static_cast<unsigned char>(*byte) & 0x0F];
  }
  data["content_hex"] = hex;
  response->SetSuccess(data);
}

// Offers "/download.bin" of the device root as "archive.zip".
void OfferDownload(ORVA::APIRequest*, ORVA::APIResponse* response) {
  response->SetEnableOutput(false);
  ORVA::APIDownload download;
  download.SetHeader("content-disposition", "attachment; filename=\"archive.zip\"");
  download.Output(OrvaPath("/download.bin"));
}

void AnswerNothing(ORVA::APIRequest*, ORVA::APIResponse*) {}

void Throw(ORVA::APIRequest*, ORVA::APIResponse*) {
  throw std::runtime_error("handler failed");
}

// Makes the file "entered", then waits (at most 20 s) until the file
// "release" exists. With "restart" it then asks for a web server restart.
void Hold(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  std::ofstream(request->GetParam("entered", "").asString()) << "in\n";
  std::string release = request->GetParam("release", "").asString();
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
  while (access(release.c_str(), F_OK) != 0) {
    if (std::chrono::steady_clock::now() > deadline) {
      response->SetError(5501, Json::Value());
      return;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  response->SetHttpdRestart(request->HasParam("restart"));
  response->SetSuccess(true);
}

void AskForRestart(ORVA::APIRequest*, ORVA::APIResponse* response) {
  response->SetHttpdRestart(true);
  Json::Value data(Json::objectValue);
  data["restart_httpd"] = true;
  response->SetSuccess(data);
}

const ORVA::APIEntry kTable[] = {
    {"ORVA.Test", 1, "echo", Echo},
    {"ORVA.Test", 1, "upload", ReadUpload},
    {"ORVA.Test", 1, "download", OfferDownload},
    {"ORVA.Test", 1, "silent", AnswerNothing},
    {"ORVA.Test", 1, "throws", Throw},
    {"ORVA.Test", 1, "hold", Hold},
    {"ORVA.Test", 1, "restart", AskForRestart},
};
static_assert(sizeof(kTable) / sizeof(kTable[0]) == kModuleApiCount,
              "the host reads exactly this many rows of a module's table");

}  // namespace

extern "C" const ORVA::APIEntry* GetAPITable() { return kTable; }
