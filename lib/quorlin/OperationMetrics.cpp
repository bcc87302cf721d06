// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/operationReports.h"

#include <atomic>

namespace Quorlin {

namespace {

// Each points to what was there before and none is ever destroyed: a thread that reads the newest needs no
// lock to know that it stays.
struct Installed {
  boost::shared_ptr<OperationMetrics> metrics;
  const Installed* before;
};

std::atomic<const Installed*> newest(nullptr);

}  // namespace

const char* GetOutcomeName(OperationOutcome outcome) {
  switch (outcome) {
    case OperationOutcome::SUCCESS:
      return "success";
    case OperationOutcome::INVALID_ARGUMENT:
      return "invalid_argument";
    case OperationOutcome::COMMUNICATION:
      return "communication";
    case OperationOutcome::CANCELLED:
      return "cancelled";
    case OperationOutcome::INVALID_CREDENTIALS:
      return "invalid_credentials";
    case OperationOutcome::INVALID_TOKEN:
      return "invalid_token";
    case OperationOutcome::SERVICE_ERROR:
      return "service_error";
    case OperationOutcome::OTHER:
      break;
  }
  return "other";
}

void InstallOperationMetrics(const boost::shared_ptr<OperationMetrics>& metrics) {
  Installed* const installed = new Installed{metrics, newest.load(std::memory_order_acquire)};
  while (!newest.compare_exchange_weak(installed->before, installed, std::memory_order_acq_rel)) {
  }
}

void ReportOperation(const OperationReport& report) noexcept {
  const Installed* const installed = newest.load(std::memory_order_acquire);
  if (installed == nullptr || !installed->metrics) {
    return;
  }
  try {
    installed->metrics->OperationEnded(report);
  } catch (...) {
    // The operation has its result; what goes wrong in counting it must not take that away.
  }
}

}  // namespace Quorlin
