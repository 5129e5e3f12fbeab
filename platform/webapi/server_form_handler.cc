#include "platform/webapi/server_form_handler.h"

namespace {
std::shared_mutex gFormLock;
}  // namespace

ServerFormHandler::ServerFormHandler(bool lockOnProcess, const char* name)
    : lock_on_process_(lockOnProcess), name_(name) {}

ServerFormHandler::~ServerFormHandler() = default;

int ServerFormHandler::Process() {
  if (lock_on_process_ && ExLock() != 0) return -1;
  int result = HandleLoadAction();
  if (result != 0) return result;
  return HandleApplyAction();
}

int ServerFormHandler::HandleLoadAction() { return 0; }

int ServerFormHandler::HandleApplyAction() { return 0; }

int ServerFormHandler::ExLock() {
  if (exclusive_.owns_lock() || shared_.owns_lock()) return -1;
  exclusive_ = std::unique_lock<std::shared_mutex>(gFormLock);
  return 0;
}

int ServerFormHandler::ShLock() {
  if (exclusive_.owns_lock() || shared_.owns_lock()) return -1;
  shared_ = std::shared_lock<std::shared_mutex>(gFormLock);
  return 0;
}

int ServerFormHandler::Authenticate() { return 0; }
