#include "upload/sslca_form_handler.h"

SSLCAFormHandler::SSLCAFormHandler() : ServerFormHandler(false, nullptr) {}

SSLCAFormHandler::~SSLCAFormHandler() = default;

int SSLCAFormHandler::HandleLoadAction() { return 0; }

int SSLCAFormHandler::HandleApplyAction() { return 0; }
