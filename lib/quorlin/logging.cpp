// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/logging.h"

#include <pelmar/Ref.h>

#include <atomic>

namespace Quorlin {

using Pelmar::Service::Logger;

namespace {

constexpr const char* kLoggerName = "Quorlin";

// Owns one reference, which is never given back: threads that are still running at process exit may log to
// the end.
std::atomic<Logger*> cachedLogger(nullptr);

Pelmar::Ref<Logger> FindLogger() {
  Pelmar::Ref<Logger> logger;
  Pelmar::Service::GetApp()->GetLogManager()->GetLogger(kLoggerName, Pelmar::Service::kAllLogLevels, logger);
  return logger;
}

}  // namespace

Logger* getLogger() {
  if (Logger* logger = cachedLogger.load(std::memory_order_acquire)) {
    return logger;
  }
  // Threads that arrive together all ask the platform, which gives each the same logger; the first one's
  // reference stays in the cache.
  const Pelmar::Ref<Logger> logger = FindLogger();
  Logger* expected = nullptr;
  logger->AddRef();
  if (!cachedLogger.compare_exchange_strong(expected, logger.Get(), std::memory_order_acq_rel)) {
    logger->Release();
    return expected;
  }
  return logger.Get();
}

}  // namespace Quorlin
