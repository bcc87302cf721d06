// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/system/ThreadPool.h>

#include <pelmar/service/Logger.h>

#include "pelmar/system/ThreadPoolImpl.h"

#include <openssl/crypto.h>

namespace Pelmar {
namespace System {

namespace {

/// Work is mostly waiting for a server, so the bound is far above the number of processors; it keeps a host
/// that queues without end from exhausting its address space.
constexpr std::size_t kMaxThreads = 256;

/// Long enough that a host that calls every few seconds keeps its threads.
constexpr std::chrono::seconds kIdleTime(30);

void LogEscaped(const std::string& description) {
  Ref<Service::Logger> logger;
  Service::GetApp()->GetLogManager()->GetLogger("Pelmar", Service::kAllLogLevels, logger);
  Service::LogInternal(logger.Get(), Service::LOG_ERROR, "An exception escaped a work item: %1",
                       StringFormatter(description));
}

/// Shuts the process's pool down when the process exits or unloads the library.
class ShutdownAtExit final {
 public:
  explicit ShutdownAtExit(ThreadPoolImpl* pool) : _pool(pool) {}
  ShutdownAtExit(const ShutdownAtExit&) = delete;
  ShutdownAtExit& operator=(const ShutdownAtExit&) = delete;
  ~ShutdownAtExit() { _pool->Shutdown(); }

 private:
  ThreadPoolImpl* const _pool;
};

ThreadPoolImpl* CreateProcessPool() {
  // OpenSSL registers its clean-up with atexit when it is first used. Used here first, it is cleaned up after
  // the pool, and items that still run at exit find it alive. (With no option at all the call would return
  // before it registers.)
  OPENSSL_init_crypto(OPENSSL_INIT_LOAD_CRYPTO_STRINGS, nullptr);
  return new ThreadPoolImpl({kMaxThreads, kIdleTime, LogEscaped, StartThread});
}

}  // namespace

ScheduledItem::~ScheduledItem() = default;

ThreadPool* GetThreadPool() {
  // Never destroyed: other objects that end with the process may still queue, and their items are dropped.
  static ThreadPoolImpl* const pool = CreateProcessPool();
  static const ShutdownAtExit shutdownAtExit(pool);
  return pool;
}

}  // namespace System
}  // namespace Pelmar
