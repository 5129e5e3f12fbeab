#ifndef ORVA_PLATFORM_WEBAPI_SERVER_FORM_HANDLER_H_
#define ORVA_PLATFORM_WEBAPI_SERVER_FORM_HANDLER_H_

#include <mutex>
#include <shared_mutex>

// Base of the form handlers that modules derive for file-based work. A form
// handler lives for one request.
class ServerFormHandler {
 public:
  // `lockOnProcess`: Process() takes the exclusive form lock around the two
  // actions. `name`: a label for the handler, or null.
  ServerFormHandler(bool lockOnProcess, const char* name);

  // Runs HandleLoadAction() and then, when it returned 0,
  // HandleApplyAction(); returns the first non-zero result, or 0.
  virtual int Process();
  virtual int HandleLoadAction();
  virtual int HandleApplyAction();
  // Releases a form lock still held.
  virtual ~ServerFormHandler();
  // Take the process-wide form lock exclusively or shared, for the rest of
  // the handler's life. Return 0; a second lock call on one handler is
  // refused with -1.
  virtual int ExLock();
  virtual int ShLock();
  // 0: the request was authenticated. The host checks every request's token
  // before any handler runs, so a handler only ever sees authenticated
  // requests.
  virtual int Authenticate();

  ServerFormHandler(const ServerFormHandler&) = delete;
  ServerFormHandler& operator=(const ServerFormHandler&) = delete;

  const char* name() const { return name_; }

 private:
  bool lock_on_process_;
  const char* name_;
  std::unique_lock<std::shared_mutex> exclusive_;
  std::shared_lock<std::shared_mutex> shared_;
};

#endif  // ORVA_PLATFORM_WEBAPI_SERVER_FORM_HANDLER_H_
