#include "platform/webapi/api_polling.h"

#include <atomic>

namespace ORVA {

namespace {
std::atomic<int> gActivePolling{0};
}  // namespace

APIPolling::APIPolling() { ++gActivePolling; }

APIPolling::~APIPolling() { --gActivePolling; }

int APIPolling::ActiveCount() { return gActivePolling.load(); }

}  // namespace ORVA
