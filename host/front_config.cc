#include "host/front_config.h"

namespace {

// Host and port as nginx's "listen" takes them.
std::string ListenTarget(const ListenAddress& address) {
  const bool ipv6 = address.host.find(':') != std::string::npos;
  return (ipv6 ? "[" + address.host + "]" : address.host) + ":" + std::to_string(address.port);
}

// `path` as a quoted nginx string in a directive that takes variables: a
// "$" becomes the variable ${dollar}, which holds one.
std::string QuotedPath(const std::string& path) {
  std::string quoted = "\"";
  for (char c : path) {
    if (c == '\\' || c == '"') quoted += '\\';
    quoted += c == '$' ? std::string("${dollar}") : std::string(1, c);
  }
  return quoted + "\"";
}

// Host-level refusals keep the web API's JSON shape.
std::string JsonRefusal(int status) {
  return "'{\"error\":{\"code\":" + std::to_string(status) + "},\"success\":false}'";
}

}  // namespace

std::string FrontConfig(const FrontSettings& settings) {
  std::string text =
      "# Written by orva-webapi serve at every start and reload; changes are lost.\n";
  if (settings.workers_as_nobody) text += "user nobody nogroup;\n";
  text +=
      "worker_processes 1;\n"
      "worker_rlimit_nofile 4096;\n"
      "pid nginx.pid;\n"
      "daemon off;\n"
      "events { worker_connections 2048; }\n"
      "http {\n"
      "  access_log off;\n"
      "  server_tokens off;\n"
      "  client_body_temp_path tmp/body;\n"
      "  proxy_temp_path tmp/proxy;\n"
      "  fastcgi_temp_path tmp/fastcgi;\n"
      "  uwsgi_temp_path tmp/uwsgi;\n"
      "  scgi_temp_path tmp/scgi;\n"
      "  types {\n"
      "    text/html html; text/css css; text/javascript js mjs; application/json json;\n"
      "    image/svg+xml svg; image/png png; image/x-icon ico; text/plain txt;\n"
      "  }\n"
      "  default_type application/octet-stream;\n"
      "  charset utf-8;\n"
      "  charset_types text/css text/javascript text/plain application/json;\n"
      // A client holds little memory and not for long, whatever it sends or
      // leaves unsent: headers in at most four 8 KiB buffers, 10 s to send
      // them or the next piece of a body, bodies beyond 16 KiB on disk.
      "  client_header_buffer_size 1k;\n"
      "  large_client_header_buffers 4 8k;\n"
      "  client_header_timeout 10s;\n"
      "  client_body_timeout 10s;\n"
      "  client_body_buffer_size 16k;\n"
      "  client_max_body_size " + std::to_string(settings.max_body_bytes) + ";\n"
      "  send_timeout 10s;\n"
      "  keepalive_timeout 10s;\n"
      "  keepalive_requests 100;\n"
      "  lingering_time 10s;\n"
      "  reset_timedout_connection on;\n"
      "  limit_conn_zone $binary_remote_addr zone=per_address:1m;\n"
      "  limit_conn per_address 32;\n"
      "  max_ranges 1;\n"
      "  geo $dollar { default \"$\"; }\n"
      "  map $uri $cache_control { /webapi no-store; default no-cache; }\n"
      "  ssl_protocols TLSv1.2 TLSv1.3;\n"
      "  ssl_ciphers ECDHE-ECDSA-AES128-GCM-SHA256:ECDHE-RSA-AES128-GCM-SHA256:"
      "ECDHE-ECDSA-AES256-GCM-SHA384:ECDHE-RSA-AES256-GCM-SHA384:"
      "ECDHE-ECDSA-CHACHA20-POLY1305:ECDHE-RSA-CHACHA20-POLY1305;\n"
      "  ssl_prefer_server_ciphers on;\n"
      // Every handshake is a full one, so none resumes into the
      // certificate of before a reload.
      "  ssl_session_tickets off;\n"
      "  server {\n"
      "    listen " + ListenTarget(settings.http) + ";\n";
  if (settings.with_https) {
    text += "    listen " + ListenTarget(settings.https) + " ssl;\n"
            "    ssl_certificate tls/server.pem;\n"
            "    ssl_certificate_key tls/server.key;\n";
  }
  text +=
      "    root " + QuotedPath(settings.web) + ";\n"
      "    disable_symlinks on from=$document_root;\n"
      "    add_header Cache-Control $cache_control always;\n"
      // The page's icon is an empty data: URL.
      "    add_header Content-Security-Policy \"default-src 'self'; img-src 'self' data:; "
      "frame-ancestors 'none'; base-uri 'none'; form-action 'self'\" always;\n"
      "    add_header X-Frame-Options DENY always;\n"
      "    add_header X-Content-Type-Options nosniff always;\n"
      // An ACME authority fetches a token by its name: the token alphabet
      // of RFC 8555 only, a file only. Nothing else there is served or
      // listed, so a file left by another tool stays out of reach.
      "    location ^~ /.well-known/acme-challenge/ {\n"
      "      location ~ \"^/\\.well-known/acme-challenge/[A-Za-z0-9_-]+$\" {\n"
      "        root " + QuotedPath(settings.acme_webroot) + ";\n"
      "        try_files $uri =404;\n"
      "        default_type text/plain;\n"
      "      }\n"
      "      return 404;\n"
      "    }\n"
      "    location = /webapi {\n"
      "      default_type application/json;\n"
      // HEAD would run a handler and drop its answer.
      "      if ($request_method !~ ^(GET|POST)$) { return 405 " + JsonRefusal(405) + "; }\n"
      "      error_page 413 = @body_too_large;\n"
      // The host would answer each range of a list of them.
      "      proxy_set_header Range \"\";\n"
      "      proxy_set_header If-Range \"\";\n"
      // A key generation waits for the changes before it.
      "      proxy_read_timeout 600s;\n"
      "      proxy_pass http://127.0.0.1:" + std::to_string(settings.backend_port) + ";\n"
      "    }\n"
      "    location @body_too_large {\n"
      "      default_type application/json;\n"
      "      return 413 " + JsonRefusal(413) + ";\n"
      "    }\n"
      "  }\n"
      "}\n";
  return text;
}
