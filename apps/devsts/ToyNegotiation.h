// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A mechanism of as many legs as one likes, to try negotiations with where there is no Kerberos.
//
// A toy, for tests and demonstrations: whoever overhears it can try passwords against what was said. Within
// itself it is honest: nobody gets through who does not know the user's password, and nothing that was said
// once helps a second time.
//
// A leg is text, each line ended by a line feed:
//   client, first leg    "toy negotiation of N legs", user, seconds since the epoch, nonce
//   client, other legs   nonce
//   client, last leg     one line more: its proof
//   service              nonce
//   service, last leg    its proof, when it is made to give one
// A proof is HMAC-SHA256 (RFC 2104) under the password, in lower-case hexadecimal, over the role ("client" or
// "service") and all that both sides have said so far. A nonce is a fresh UUID. The service's nonces keep a
// client's proof from being used again; a negotiation of one leg has none, so the service also refuses a
// first leg whose time is more than five minutes off, and one with which somebody was already let in.

#ifndef QUORLIN_DEVSTS_TOYNEGOTIATION_H
#define QUORLIN_DEVSTS_TOYNEGOTIATION_H

#include "devsts/Clock.h"
#include "devsts/Directory.h"
#include "devsts/MessageSignature.h"
#include "devsts/Negotiation.h"
#include "devsts/Secret.h"

#include <cstddef>
#include <memory>
#include <string>

namespace DevSts {

constexpr unsigned kMaxToyLegs = 100;
constexpr std::size_t kMaxToyLegBytes = 1024;
/// In microseconds.
constexpr long long kMaxToyClockSkew = 5 * 60 * kMicrosecondsPerSecond;

/// What both sides have agreed on before.
struct ToyOptions {
  unsigned legs = 2;       ///< How many the client sends: 1 to kMaxToyLegs.
  bool provesBack = true;  ///< Whether the service ends with a proof of its own.
};

/// What the two sides have said, as each proof covers it.
class ToyTranscript final {
 public:
  void Add(const std::string& leg);
  /// A copy of this transcript with `leg` at its end, proven by whoever knows `password`.
  std::string Prove(const char* role, const std::string& leg, const std::string& password) const;

 private:
  std::string _text;
};

/// What all negotiations of a service share.
struct ToyService;

/// The service's side.
class ToyMechanism final : public NegotiationMechanism {
 public:
  /// Knows the users of `directory` by their passwords. Throws std::invalid_argument for a bad number of
  /// legs.
  ToyMechanism(const ToyOptions& options, const Directory& directory, const Clock& clock);

  std::unique_ptr<Negotiation> Begin() const override;
  std::string GetAuthnContext() const override { return kPasswordContext; }

 private:
  std::shared_ptr<ToyService> _service;
};

/// The client's side of one negotiation. For one thread at a time.
class ToyClient final {
 public:
  ToyClient(const ToyOptions& options, const std::string& user, const std::string& password,
            const Clock& clock);

  /// The answer to the service's leg, which is empty at first. The service's proof is answered by a last leg
  /// that nobody has to send. Throws Pelmar::Exception when the service does not know the password, or says
  /// something that has no place here.
  NegotiationLeg Answer(const NegotiationLeg& serverLeg);

 private:
  std::string MakeLeg() const;
  NegotiationLeg CheckProof(const std::string& serverLeg);

  ToyOptions _options;
  std::string _user;
  Secret _password;
  Clock _clock;
  ToyTranscript _transcript;
  unsigned _sent = 0;
  bool _isOver = false;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_TOYNEGOTIATION_H
