// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/NegotiationTable.h"

#include "devsts/Fault.h"

#include <utility>

namespace DevSts {

namespace {

bool IsTooOld(const RunningNegotiation& running, long long now) {
  return now - running.started >= kMaxNegotiationAge;
}

void DropOld(std::map<std::string, RunningNegotiation>& running, long long now) {
  for (auto item = running.begin(); item != running.end();) {
    item = IsTooOld(item->second, now) ? running.erase(item) : std::next(item);
  }
}

}  // namespace

void NegotiationTable::Put(const std::string& id, RunningNegotiation running, long long now) {
  const std::lock_guard<std::mutex> lock(_mutex);
  if (_running.size() >= kMaxNegotiations) {
    DropOld(_running, now);
  }
  if (_running.size() >= kMaxNegotiations) {
    throw Fault(FaultCode::SERVER, "Too many negotiations are under way");
  }
  _running.emplace(id, std::move(running));
}

RunningNegotiation NegotiationTable::Take(const std::string& id, long long now) {
  const std::lock_guard<std::mutex> lock(_mutex);
  auto node = _running.extract(id);
  if (node.empty() || IsTooOld(node.mapped(), now)) {
    throw Fault(FaultCode::REQUEST_FAILED, "The negotiation is not known or has ended");
  }
  return std::move(node.mapped());
}

}  // namespace DevSts
