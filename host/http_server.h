#ifndef ORVA_HOST_HTTP_SERVER_H_
#define ORVA_HOST_HTTP_SERVER_H_

#include <httplib.h>

#include <cstddef>
#include <functional>
#include <vector>

#include "host/access_token.h"
#include "host/api_call.h"
#include "host/call_order.h"
#include "host/front_server.h"
#include "host/request_parsing.h"
#include "platform/webapi/api_table.h"

// The host's own listener, behind nginx: GET and POST /webapi for the
// loaded modules' methods, behind the access token. nginx holds the limits
// of the network side and hands over whole request bodies.
//
// A request without the right "Authorization: Bearer TOKEN" is refused with
// 401 before its body is read, and the connection closed. A body over
// kMaxBodyBytes is refused with 413. Every host-level failure is answered
// in the JSON shape of a module's error with the HTTP status as its code.
class WebapiService {
 public:
  static constexpr size_t kMaxBodyBytes = 4 * 1024 * 1024;
  // The header that tells, on the answer to a call that asked for a web
  // server restart, which certificate HTTPS presents now: "new",
  // "previous" (the store's pair did not load) or "none" (HTTPS is off).
  static constexpr char kCertificateHeader[] = "X-Web-Certificate";

  // `tables`: the loaded modules' API tables, searched in order; the
  // modules must outlive this object. `restart`, when set, is called when a
  // handler asks for a web server restart, before its answer is sent. Calls
  // take their turns in `order`, which must outlive this object.
  WebapiService(std::vector<ORVA::APITable> tables, AccessToken token,
                std::function<FrontServer::Certificate()> restart, CallOrder* order);

  WebapiService(const WebapiService&) = delete;
  WebapiService& operator=(const WebapiService&) = delete;

  // Sets up the routes, limits, timeouts and failure answers on `server`,
  // which must be stopped before this object goes away.
  void Install(httplib::Server* server);

  // Calls `call` as a /webapi request that passed the door is called: by
  // the first table that has its row, in its turn of the order, and, when
  // the handler asks for a web server restart, with the restart done before
  // returning. *certificate is then the value of kCertificateHeader, else
  // null (it points to a constant).
  CallOutcome Call(const WebapiCall& call, const char** certificate);

 private:
  httplib::Server::HandlerResponse Guard(const httplib::Request& request,
                                         httplib::Response* response) const;
  void ServeWebapi(const httplib::Request& request, httplib::Response* response);
  CallOutcome Dispatch(const WebapiCall& call);

  const std::vector<ORVA::APITable> tables_;
  const AccessToken token_;
  const std::function<FrontServer::Certificate()> restart_;
  CallOrder* const order_;
};

#endif  // ORVA_HOST_HTTP_SERVER_H_
