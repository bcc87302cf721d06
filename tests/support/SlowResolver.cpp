// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/SlowResolver.h"

#include <dlfcn.h>
#include <netdb.h>

#include <condition_variable>
#include <cstring>
#include <mutex>

namespace TestSupport {

const char* const kSlowHost = "slow.test";

namespace {

struct State {
  std::mutex mutex;
  std::condition_variable changed;
  bool isSlow = false;
  int waiting = 0;
};

// Never destroyed: a look-up may be under way when the process ends.
State& GetState() {
  static State* const state = new State();
  return *state;
}

int WaitAndFail() {
  State& state = GetState();
  std::unique_lock<std::mutex> lock(state.mutex);
  if (state.isSlow) {
    ++state.waiting;
    state.changed.notify_all();
    state.changed.wait(lock, [&] { return !state.isSlow; });
    --state.waiting;
    state.changed.notify_all();
  }
  return EAI_FAIL;
}

}  // namespace

SlowResolver::SlowResolver() {
  State& state = GetState();
  const std::lock_guard<std::mutex> lock(state.mutex);
  state.isSlow = true;
}

SlowResolver::~SlowResolver() {
  State& state = GetState();
  std::unique_lock<std::mutex> lock(state.mutex);
  state.isSlow = false;
  state.changed.notify_all();
  state.changed.wait(lock, [&] { return state.waiting == 0; });
}

void SlowResolver::AwaitLookUp() {
  State& state = GetState();
  std::unique_lock<std::mutex> lock(state.mutex);
  state.changed.wait(lock, [&] { return state.waiting > 0; });
}

}  // namespace TestSupport

// The program's own symbol comes before that of the C library, also for the shared libraries it uses.
extern "C" __attribute__((visibility("default"))) int getaddrinfo(const char* node, const char* service,
                                                                  const addrinfo* hints, addrinfo** result) {
  if (node != nullptr && std::strcmp(node, TestSupport::kSlowHost) == 0) {
    return TestSupport::WaitAndFail();
  }
  using Function = int (*)(const char*, const char*, const addrinfo*, addrinfo**);
  static const auto function = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "getaddrinfo"));
  return function(node, service, hints, result);
}
