#include "host/https_listener.h"

#include <utility>

#include "common/log.h"
#include "platform/olib/orva_conf.h"

HttpsListener::HttpsListener(ListenAddress address,
                             std::function<void(httplib::Server*)> install,
                             CallOrder* store_order)
    : address_(std::move(address)), install_(std::move(install)), store_order_(store_order) {}

HttpsListener::~HttpsListener() { Stop(); }

void HttpsListener::Start() {
  Apply();
  reload_thread_ = std::thread([this] { ReloadLoop(); });
}

void HttpsListener::RequestReload() {
  {
    std::lock_guard<std::mutex> lock(request_mutex_);
    reload_requested_ = true;
  }
  request_signal_.notify_one();
}

void HttpsListener::Stop() {
  {
    std::lock_guard<std::mutex> lock(request_mutex_);
    stopping_ = true;
  }
  request_signal_.notify_one();
  if (reload_thread_.joinable()) reload_thread_.join();
  std::lock_guard<std::mutex> lock(apply_mutex_);
  TakeDown();
}

void HttpsListener::ReloadLoop() {
  for (;;) {
    {
      std::unique_lock<std::mutex> lock(request_mutex_);
      request_signal_.wait(lock, [this] { return reload_requested_ || stopping_; });
      if (stopping_) return;
      reload_requested_ = false;
    }
    Apply();
  }
}

void HttpsListener::Apply() {
  std::lock_guard<std::mutex> lock(apply_mutex_);
  OrvaConf configuration;
  if (configuration.Info("runHTTPS", "") != "yes") {
    TakeDown();
    state_ = State::kOff;
    return;
  }
  std::string problem;
  std::shared_ptr<const ServerCredentials> credentials;
  {
    CallOrder::Turn whole_set(store_order_);
    credentials = ServerCredentials::LoadFromStore(&problem);
  }
  if (!credentials) {
    ORVA_LOG("HTTPS listener is down: %s", problem.c_str());
    TakeDown();
    state_ = State::kDown;
    return;
  }
  {
    std::lock_guard<std::mutex> swap(credentials_mutex_);
    credentials_ = std::move(credentials);
  }
  if (server_ == nullptr && !BringUp()) {
    state_ = State::kDown;
    return;
  }
  state_ = State::kUp;
}

bool HttpsListener::BringUp() {
  auto server = std::make_unique<httplib::SSLServer>(
      [this](SSL_CTX& context) { return SetUpContext(&context); });
  if (!server->is_valid()) {
    ORVA_LOG("HTTPS listener is down: no TLS context");
    return false;
  }
  install_(server.get());
  const int wanted = bound_port_ != 0 ? bound_port_.load() : address_.port;
  int port = wanted;
  if (wanted == 0) {
    port = server->bind_to_any_port(address_.host);
  } else if (!server->bind_to_port(address_.host, wanted)) {
    port = -1;
  }
  if (port <= 0) {
    ORVA_LOG("HTTPS listener is down: cannot listen on %s",
             ListenUrl("https", address_.host, wanted, "/").c_str());
    return false;
  }
  bound_port_ = port;
  listener_ = std::make_unique<ListenerThread>(server.get());
  server_ = std::move(server);
  return true;
}

void HttpsListener::TakeDown() {
  listener_.reset();
  server_.reset();
}

bool HttpsListener::SetUpContext(SSL_CTX* context) {
  // Without tickets or a session cache every handshake is a full one, so a
  // client never resumes into the certificate of before a reload.
  SSL_CTX_set_options(context, SSL_OP_NO_TICKET);
  SSL_CTX_set_session_cache_mode(context, SSL_SESS_CACHE_OFF);
  SSL_CTX_set_cert_cb(context, &HttpsListener::SelectCertificate, this);
  return SSL_CTX_set_min_proto_version(context, TLS1_2_VERSION) == 1;
}

int HttpsListener::SelectCertificate(SSL* ssl, void* listener) {
  auto* self = static_cast<HttpsListener*>(listener);
  std::shared_ptr<const ServerCredentials> credentials;
  {
    std::lock_guard<std::mutex> lock(self->credentials_mutex_);
    credentials = self->credentials_;
  }
  if (!credentials) return 0;
  return SSL_use_cert_and_key(ssl, credentials->certificate(), credentials->key(),
                              credentials->chain(), 1);
}
