// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the exchanges of one connection spec have in common: resolved addresses and TLS sessions.

#ifndef PELMAR_HTTP_SPECSHARE_H
#define PELMAR_HTTP_SPECSHARE_H

#include <curl/curl.h>

#include <algorithm>
#include <limits>
#include <memory>

namespace Pelmar {
namespace Http {

/// Seconds since the epoch.
using Seconds = long long;

/// Until when TLS sessions may be resumed. Resuming one checks no certificate, so that a session must not
/// outlive the chain that was verified when it began.
class SessionExpiry final {
 public:
  /// A session is kept whose chain holds until `end`.
  void Limit(Seconds end) { _end = std::min(_end, end); }
  Seconds Get() const { return _end; }
  bool HasPassed(Seconds now) const { return now > _end; }
  /// No session is kept any more.
  void Reset() { _end = std::numeric_limits<Seconds>::max(); }

 private:
  Seconds _end = std::numeric_limits<Seconds>::max();
};

/// What one exchange is given. `handle` has the sessions that `expiry` is about.
struct SharedState {
  std::shared_ptr<CURLSH> handle;
  std::shared_ptr<SessionExpiry> expiry;
};

/// Lives on the HTTP loop's thread.
class SpecShare final {
 public:
  /// For an exchange that starts at `now`. All get the same until a certificate behind one of the sessions
  /// has expired; then all sessions are forgotten. Throws HttpException when the engine cannot be set up.
  const SharedState& Get(Seconds now);

 private:
  // The expiry stays the same object: a connection may be given a session at any time, also when it has come
  // to serve an exchange with a later handle than its first.
  SharedState _state{nullptr, std::make_shared<SessionExpiry>()};
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_SPECSHARE_H
