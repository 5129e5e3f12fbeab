#ifndef ORVA_HOST_HTTP_SERVER_H_
#define ORVA_HOST_HTTP_SERVER_H_

#include <httplib.h>

#include <cstddef>
#include <functional>
#include <vector>

#include "host/access_token.h"
#include "host/api_call.h"
#include "host/call_order.h"
#include "host/request_parsing.h"
#include "host/static_files.h"
#include "platform/webapi/api_table.h"

// What the HTTP and the HTTPS listener serve: GET and POST /webapi for the
// loaded modules' methods, behind the access token, and the web page's
// files at every other path, without it.
//
// Before any body is read, a request with a Transfer-Encoding is refused
// with 411 (its size is not known in advance) and a /webapi request without
// the right "Authorization: Bearer TOKEN" with 401; both close the
// connection. A body over kMaxBodyBytes is refused with 413. Every
// host-level failure is answered in the JSON shape of a module's error with
// the HTTP status as its code.
class WebapiService {
 public:
  static constexpr size_t kMaxBodyBytes = 4 * 1024 * 1024;

  // `tables`: the loaded modules' API tables, searched in order; the
  // modules must outlive this object. `restart`, when set, is called after
  // the answer to a call whose handler asked for a web server restart has
  // been sent. Calls take their turns in `order`, which must outlive this
  // object.
  WebapiService(std::vector<ORVA::APITable> tables, AccessToken token,
                StaticFiles web, std::function<void()> restart, CallOrder* order);

  WebapiService(const WebapiService&) = delete;
  WebapiService& operator=(const WebapiService&) = delete;

  // Sets up the routes, limits, timeouts and failure answers on `server`,
  // which must be stopped before this object goes away.
  void Install(httplib::Server* server);

 private:
  httplib::Server::HandlerResponse Guard(const httplib::Request& request,
                                         httplib::Response* response) const;
  void ServeWebapi(const httplib::Request& request, httplib::Response* response);
  CallOutcome Dispatch(const WebapiCall& call);

  const std::vector<ORVA::APITable> tables_;
  const AccessToken token_;
  const StaticFiles web_;
  const std::function<void()> restart_;
  CallOrder* const order_;
};

#endif  // ORVA_HOST_HTTP_SERVER_H_
