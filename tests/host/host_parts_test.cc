// Parts of the host on their own: the order of calls, which a running server
// shows only by timing, and the blank that ends the token's scheme.

#include <sys/syscall.h>
#include <unistd.h>

#include <filesystem>
#include <future>
#include <map>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "host/access_token.h"
#include "host/call_order.h"
#include "tests/host/serve_process.h"

namespace {

// Waits until every other thread of this process sleeps, so that the
// threads a test started have come as far as they can.
bool OtherThreadsSleep() {
  return WaitFor([] {
    const std::string self = std::to_string(syscall(SYS_gettid));
    std::error_code error;
    for (std::filesystem::directory_iterator task("/proc/self/task", error), end;
         !error && task != end; task.increment(error)) {
      const std::string stat = ReadFile(task->path().string() + "/stat");
      const std::string::size_type state = stat.rfind(") ") + 2;
      if (task->path().filename() != self && state < stat.size() && stat[state] != 'S') {
        return false;
      }
    }
    return !error;
  });
}

}  // namespace

TEST(CallOrder, ListNeverWaitsAndChangesStartOneAtATimeInTheOrderTheyCame) {
  // Each step: a call arrives (with its api and method) or a running call
  // ends; then the calls that start.
  const struct {
    const char* call;
    const char* api;  // null: the call ends
    const char* method;
    const char* starting;
  } steps[] = {
      {"reader 1", "ORVA.Core.Certificate", "list", "reader 1 "},
      // Only the certificate list goes without a turn: "list" of another api
      // changes the store.
      {"writer 1", "ORVA.Core.Certificate.CSR", "list", "writer 1 "},
      {"writer 2", "ORVA.Core.Certificate.CRT", "create", ""},
      {"reader 2", "ORVA.Core.Certificate", "list", "reader 2 "},
      {"writer 3", "ORVA.Core.Certificate.CRT", "create", ""},
      {"writer 1", nullptr, nullptr, "writer 2 "},
      {"reader 1", nullptr, nullptr, ""},
      {"writer 2", nullptr, nullptr, "writer 3 "},
      {"reader 2", nullptr, nullptr, ""},
      {"writer 3", nullptr, nullptr, ""},
  };
  CallOrder order;
  std::mutex started_mutex;
  std::string started, expected;
  std::map<std::string, std::promise<void>> ends;
  std::vector<std::thread> calls;
  for (const auto& step : steps) {
    SCOPED_TRACE(std::string(step.api != nullptr ? "arrives: " : "ends: ") + step.call);
    if (step.api == nullptr) {
      ends[step.call].set_value();
    } else {
      calls.emplace_back([&, step, end = ends[step.call].get_future()] {
        CallOrder::Turn turn(&order, step.api, step.method);
        {
          std::lock_guard<std::mutex> lock(started_mutex);
          started += std::string(step.call) + " ";
        }
        end.wait();
      });
    }
    // Every step runs, even after a failure, so that every call ends.
    EXPECT_TRUE(OtherThreadsSleep());
    expected += step.starting;
    std::lock_guard<std::mutex> lock(started_mutex);
    EXPECT_EQ(expected, started);
  }
  for (std::thread& call : calls) call.join();
}

// The door table proves the scheme in any case and other schemes refused.
TEST(AccessToken, TheBearerSchemeEndsInABlank) {
  TempDeviceRoot root;
  root.WriteFile("/token", "s3cret\n");
  AccessToken token;
  std::string error;
  ASSERT_TRUE(token.LoadFromFile(root.Path("/token"), &error)) << error;
  EXPECT_TRUE(token.Accepts("Bearer s3cret"));
  EXPECT_FALSE(token.Accepts("Bearer_s3cret"));
}
