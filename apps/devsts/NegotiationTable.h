// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The negotiations that are under way.

#ifndef QUORLIN_DEVSTS_NEGOTIATIONTABLE_H
#define QUORLIN_DEVSTS_NEGOTIATIONTABLE_H

#include "devsts/Clock.h"
#include "devsts/Negotiation.h"
#include "devsts/TokenRequest.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>

#include <cstddef>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace DevSts {

/// Anybody may begin a negotiation, so there is an end to what that costs.
constexpr std::size_t kMaxNegotiations = 1000;
/// A client that has not come to an end by then has to start over. In microseconds.
constexpr long long kMaxNegotiationAge = 5 * 60 * kMicrosecondsPerSecond;

/// A negotiation between two of its legs, with what its first message said.
struct RunningNegotiation {
  std::unique_ptr<Negotiation> negotiation;
  TokenRequest wishes;
  /// The certificate whose key signed the first message, and the Id of that signature; null: it was not
  /// signed.
  Pelmar::Ref<const Pelmar::Crypto::Certificate> proofCertificate;
  std::string proofSignatureId;
  std::string cookie;     ///< "name=value" that every further leg has to bring; empty: none.
  long long started = 0;  ///< Microseconds since the epoch.
};

/// Safe to use from any thread. Whoever takes a negotiation out has it alone until it is put back, so that
/// two messages that name the same one never meet in it.
class NegotiationTable final {
 public:
  /// Keeps `running` under `id` until it is taken or too old. Throws Fault when there are too many.
  void Put(const std::string& id, RunningNegotiation running, long long now);

  /// Throws Fault when there is none of that name, be it unknown, ended, too old, or with another thread.
  RunningNegotiation Take(const std::string& id, long long now);

 private:
  std::mutex _mutex;
  std::map<std::string, RunningNegotiation> _running;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_NEGOTIATIONTABLE_H
