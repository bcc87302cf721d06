// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Everything libcurl of this process: the lanes of all user agents, and what specs share.

#ifndef PELMAR_HTTP_LANESET_H
#define PELMAR_HTTP_LANESET_H

#include "pelmar/http/CurlHandles.h"
#include "pelmar/http/Exchange.h"
#include "pelmar/http/Lane.h"
#include "pelmar/http/Poller.h"
#include "pelmar/http/SpecShare.h"

#include <cstdint>
#include <functional>
#include <map>
#include <memory>

namespace Pelmar {
namespace Http {

/// Lives on the HTTP loop's thread.
class LaneSet final {
 public:
  /// Tells the time that certificates are judged by.
  using GetTimeFunction = std::function<Seconds()>;

  LaneSet(Poller& poller, GetTimeFunction getTime);
  LaneSet(const LaneSet&) = delete;
  LaneSet& operator=(const LaneSet&) = delete;
  ~LaneSet();

  /// Starts an exchange; settles it with the error if that fails.
  void Submit(const Ref<Exchange>& exchange);
  void Abandon(const Exchange& exchange);
  /// Closes the agent's connections, as soon as its last exchange is done.
  void DropAgent(std::uint64_t agent);
  /// Forgets the spec's TLS sessions. Its agents are gone by then.
  void DropSpec(std::uint64_t spec);

  /// Waits for something to do, at most `maxMilliseconds` (negative: no limit), and does it.
  void Turn(int maxMilliseconds);

 private:
  struct LaneEntry {
    std::unique_ptr<Lane> lane;
    bool isOrphan;
  };

  std::shared_ptr<const HttpException> TryStart(const Ref<Exchange>& exchange) noexcept;
  Lane& GetLane(std::uint64_t agent);
  int GetTimeout(int maxMilliseconds) const;
  void RunDeadlines();
  void RemoveOrphans();

  Poller& _poller;
  const GetTimeFunction _getTime;
  SocketOwners _owners;
  // Before the lanes, so that it goes after them: their connections use it.
  std::map<std::uint64_t, SpecShare> _shares;
  std::map<std::uint64_t, LaneEntry> _lanes;
  bool _mayHaveOrphans = false;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_LANESET_H
