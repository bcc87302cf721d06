// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/LaneSet.h"

#include "pelmar/http/SpareFailures.h"

#include <algorithm>
#include <exception>
#include <iterator>
#include <limits>
#include <utility>

namespace Pelmar {
namespace Http {

namespace {

/// Rounded up: to wake early is to wake twice.
int CountMilliseconds(Lane::Clock::duration duration) {
  const auto count = std::chrono::ceil<std::chrono::milliseconds>(duration).count();
  return static_cast<int>(std::clamp<long long>(count, 0, std::numeric_limits<int>::max()));
}

}  // namespace

LaneSet::LaneSet(Poller& poller, GetTimeFunction getTime) : _poller(poller), _getTime(std::move(getTime)) {}

LaneSet::~LaneSet() = default;

void LaneSet::Submit(const Ref<Exchange>& exchange) {
  if (exchange->IsSettled()) {
    return;
  }
  const std::shared_ptr<const HttpException> failure = TryStart(exchange);
  if (failure) {
    exchange->Settle(failure, nullptr);
  }
}

/// Null when it has started.
std::shared_ptr<const HttpException> LaneSet::TryStart(const Ref<Exchange>& exchange) noexcept {
  try {
    const AgentParts& agent = exchange->GetAgent();
    try {
      GetLane(agent.id).Start(exchange, _shares[agent.spec->GetId()].Get(_getTime()));
      return nullptr;
    } catch (const HttpException& e) {
      return std::make_shared<const HttpException>(e);
    }
  } catch (const std::exception&) {
    return GetSpareFailures().outOfMemory;
  }
}

void LaneSet::Abandon(const Exchange& exchange) {
  const auto entry = _lanes.find(exchange.GetAgent().id);
  if (entry != _lanes.end()) {
    entry->second.lane->Abandon(&exchange);
  }
}

void LaneSet::DropAgent(std::uint64_t agent) {
  const auto entry = _lanes.find(agent);
  if (entry != _lanes.end()) {
    entry->second.isOrphan = true;
    _mayHaveOrphans = true;
  }
}

void LaneSet::DropSpec(std::uint64_t spec) {
  _shares.erase(spec);
}

Lane& LaneSet::GetLane(std::uint64_t agent) {
  const auto entry = _lanes.find(agent);
  if (entry != _lanes.end()) {
    return *entry->second.lane;
  }
  auto lane = std::make_unique<Lane>(_poller, _owners);
  return *_lanes.emplace(agent, LaneEntry{std::move(lane), false}).first->second.lane;
}

void LaneSet::Turn(int maxMilliseconds) {
  RemoveOrphans();
  for (const SocketEvent& event : _poller.Wait(GetTimeout(maxMilliseconds))) {
    // An earlier event may have ended the socket of a later one.
    const auto owner = _owners.find(event.socket);
    if (owner != _owners.end()) {
      owner->second->OnSocket(event);
    }
  }
  RunDeadlines();
}

int LaneSet::GetTimeout(int maxMilliseconds) const {
  int timeout = maxMilliseconds < 0 ? std::numeric_limits<int>::max() : maxMilliseconds;
  bool isLimited = maxMilliseconds >= 0;
  const Lane::Clock::time_point now = Lane::Clock::now();
  for (const auto& entry : _lanes) {
    if (entry.second.lane->GetDeadline()) {
      timeout = std::min(timeout, CountMilliseconds(*entry.second.lane->GetDeadline() - now));
      isLimited = true;
    }
  }
  return isLimited ? timeout : -1;
}

void LaneSet::RunDeadlines() {
  const Lane::Clock::time_point now = Lane::Clock::now();
  for (const auto& entry : _lanes) {
    Lane& lane = *entry.second.lane;
    if (lane.GetDeadline() && *lane.GetDeadline() <= now) {
      lane.OnDeadline();
    }
  }
}

void LaneSet::RemoveOrphans() {
  if (!_mayHaveOrphans) {
    return;
  }
  _mayHaveOrphans = false;
  for (auto entry = _lanes.begin(); entry != _lanes.end();) {
    const bool isOrphan = entry->second.isOrphan;
    const bool isDone = isOrphan && entry->second.lane->IsIdle();
    _mayHaveOrphans = _mayHaveOrphans || (isOrphan && !isDone);
    entry = isDone ? _lanes.erase(entry) : std::next(entry);
  }
}

}  // namespace Http
}  // namespace Pelmar
