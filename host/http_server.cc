#include "host/http_server.h"

#include <utility>

#include "common/log.h"
#include "host/http_answer.h"
#include "host/temporary_uploads.h"

namespace {

constexpr int kLengthRequired = 411;
constexpr int kUnauthorized = 401;
constexpr int kPayloadTooLarge = 413;
constexpr int kServerError = 500;

constexpr time_t kReadTimeoutSeconds = 30;
constexpr time_t kWriteTimeoutSeconds = 30;
constexpr time_t kKeepAliveTimeoutSeconds = 5;
constexpr size_t kWorkerThreads = 16;

constexpr char kWebapiPath[] = "/webapi";

}  // namespace

WebapiService::WebapiService(std::vector<ORVA::APITable> tables,
                             AccessToken token, StaticFiles web,
                             std::function<void()> restart, CallOrder* order)
    : tables_(std::move(tables)),
      token_(token),
      web_(std::move(web)),
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
  // A client that waits for "100 Continue" learns of an oversized body
  // before it sends it.
  server->set_expect_100_continue_handler([](const Request& request, Response& response) {
    if (request.get_header_value<uint64_t>("Content-Length") <= kMaxBodyBytes) return 100;
    response.set_header("Connection", "close");
    WriteHostFailure(kPayloadTooLarge, &response);
    return kPayloadTooLarge;
  });
  server->Get(kWebapiPath, [this](const Request& request, Response& response) {
    ServeWebapi(request, &response);
  });
  server->Post(kWebapiPath, [this](const Request& request, Response& response) {
    ServeWebapi(request, &response);
  });
  server->Get("/.*", [this](const Request& request, Response& response) {
    web_.Serve(request, &response);
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
  int refusal = 0;
  if (request.has_header("Transfer-Encoding")) {
    refusal = kLengthRequired;
  } else if (request.path == kWebapiPath &&
             !token_.Accepts(request.get_header_value("Authorization"))) {
    refusal = kUnauthorized;
    response->set_header("WWW-Authenticate", "Bearer");
  }
  if (refusal == 0) return httplib::Server::HandlerResponse::Unhandled;
  // The body is never read: the client must not send another request on
  // this connection.
  response->set_header("Connection", "close");
  WriteHostFailure(refusal, response);
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
  CallOutcome outcome = Dispatch(call);
  WriteCallOutcome(outcome, outcome.httpd_restart ? restart_ : nullptr, response);
}

CallOutcome WebapiService::Dispatch(const WebapiCall& call) {
  for (const ORVA::APITable& table : tables_) {
    if (FindApiRow(table, call.api, call.method, call.version) == nullptr) continue;
    CallOrder::Turn turn(order_, call.api, call.method);
    return CallApi(table, call.api, call.method, call.version, call.params);
  }
  return HostFailure(404);
}
