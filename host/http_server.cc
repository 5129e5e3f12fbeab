#include "host/http_server.h"

#include <utility>

#include "common/log.h"
#include "host/http_answer.h"
#include "host/temporary_uploads.h"

namespace {

constexpr int kUnauthorized = 401;
constexpr int kServerError = 500;

constexpr time_t kReadTimeoutSeconds = 30;
constexpr time_t kWriteTimeoutSeconds = 30;
constexpr time_t kKeepAliveTimeoutSeconds = 5;
constexpr size_t kWorkerThreads = 16;

constexpr char kWebapiPath[] = "/webapi";

const char* CertificateText(FrontServer::Certificate certificate) {
  switch (certificate) {
    case FrontServer::Certificate::kNew:
      return "new";
    case FrontServer::Certificate::kPrevious:
      return "previous";
    case FrontServer::Certificate::kNone:
      break;
  }
  return "none";
}

}  // namespace

WebapiService::WebapiService(std::vector<ORVA::APITable> tables,
                             AccessToken token,
                             std::function<FrontServer::Certificate()> restart,
                             CallOrder* order)
    : tables_(std::move(tables)),
      token_(token),
      restart_(std::move(restart)),
      order_(order) {}

void WebapiService::Install(httplib::Server* server) {
  using httplib::Request;
  using httplib::Response;
  server->new_task_queue = [] { return new httplib::ThreadPool(kWorkerThreads); };
  server->set_payload_max_length(kMaxBodyBytes);
  server->set_read_timeout(kReadTimeoutSeconds);
  server->set_write_timeout(kWriteTimeoutSeconds);
  server->set_keep_alive_timeout(kKeepAliveTimeoutSeconds);
  // Headers and body go out in separate writes; without this, a client on
  // a kept-alive connection waits for a delayed acknowledgement per answer.
  server->set_tcp_nodelay(true);

  server->set_pre_routing_handler(
      [this](const Request& request, Response& response) {
        return Guard(request, &response);
      });
  server->Get(kWebapiPath, [this](const Request& request, Response& response) {
    ServeWebapi(request, &response);
  });
  server->Post(kWebapiPath, [this](const Request& request, Response& response) {
    ServeWebapi(request, &response);
  });
  server->set_error_handler(httplib::Server::HandlerWithResponse(
      [](const Request&, Response& response) {
        if (!response.body.empty()) return httplib::Server::HandlerResponse::Unhandled;
        WriteHostFailure(response.status, &response);
        return httplib::Server::HandlerResponse::Handled;
      }));
  server->set_exception_handler([](const Request&, Response& response, std::exception_ptr) {
    WriteHostFailure(kServerError, &response);
  });
}

httplib::Server::HandlerResponse WebapiService::Guard(
    const httplib::Request& request, httplib::Response* response) const {
  if (token_.Accepts(request.get_header_value("Authorization"))) {
    return httplib::Server::HandlerResponse::Unhandled;
  }
  // The body is never read: the client must not send another request on
  // this connection.
  response->set_header("WWW-Authenticate", "Bearer");
  response->set_header("Connection", "close");
  WriteHostFailure(kUnauthorized, response);
  return httplib::Server::HandlerResponse::Handled;
}

void WebapiService::ServeWebapi(const httplib::Request& request,
                                httplib::Response* response) {
  TemporaryUploads uploads;
  WebapiCall call;
  int failure = ParseWebapiRequest(request, &uploads, &call);
  if (failure == kServerError) ORVA_LOG("Save uploaded file failed: %m");
  if (failure != 0) {
    WriteHostFailure(failure, response);
    return;
  }
  const char* certificate = nullptr;
  CallOutcome outcome = Call(call, &certificate);
  if (certificate != nullptr) response->set_header(kCertificateHeader, certificate);
  WriteCallOutcome(outcome, response);
}

CallOutcome WebapiService::Call(const WebapiCall& call, const char** certificate) {
  *certificate = nullptr;
  CallOutcome outcome = Dispatch(call);
  if (outcome.httpd_restart && restart_) *certificate = CertificateText(restart_());
  return outcome;
}

CallOutcome WebapiService::Dispatch(const WebapiCall& call) {
  const ORVA::APITable* table = FindServingTable(tables_, call.api, call.method, call.version);
  if (table == nullptr) return HostFailure(404);
  CallOrder::Turn turn(order_, call.api, call.method);
  return CallApi(*table, call.api, call.method, call.version, call.params);
}
