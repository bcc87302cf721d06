// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Turns requests into answers. Knows nothing of networks.

#ifndef QUORLIN_DEVSTS_REQUESTHANDLER_H
#define QUORLIN_DEVSTS_REQUESTHANDLER_H

#include "devsts/Authentication.h"
#include "devsts/Clock.h"
#include "devsts/Directory.h"
#include "devsts/Grant.h"
#include "devsts/Negotiator.h"
#include "devsts/RequestLog.h"
#include "devsts/Responses.h"
#include "devsts/TokenIssuer.h"
#include "devsts/TokenRequest.h"
#include "devsts/Trouble.h"

#include <memory>
#include <mutex>
#include <string>

namespace DevSts {

/// An HTTP answer.
struct Answer {
  int status = 0;  ///< 0: there is no answer; the connection is to be closed.
  std::string contentType;
  std::string body;
  std::string cookie;  ///< "name=value" to be set; empty: none.
};

struct HandlerOptions {
  LifetimeLimits lifetime;
  /// By how many seconds a client's clock may differ.
  long long maxClockSkewSec = 5 * 60;
  /// How clients may negotiate; empty: not at all.
  std::shared_ptr<const NegotiationMechanism> negotiation;
  /// Gives a cookie to whoever begins a negotiation, and wants it back with every further leg.
  bool cookie = false;
  TroubleOptions trouble;
};

/// The service's logic. Safe to use from any thread.
class RequestHandler final {
 public:
  /// Clock and sink may be called from several threads at once; the sink may be empty.
  RequestHandler(const HandlerOptions& options, const Directory& directory, const TokenIssuer& issuer,
                 const Clock& clock, const LogSink& log);

  /// Answers one request, given the values of its SOAPAction, Content-Type and Cookie headers as they came
  /// (empty: missing) and its body. Never throws: what cannot be granted is answered by a SOAP fault with
  /// status 500 (SOAP 1.1, section 6.2), a content type that is not text/xml by 415. Writes one line to the
  /// log.
  Answer HandleRequest(const std::string& soapAction, const std::string& contentType, const std::string& body,
                       const std::string& cookie = "");

  /// From the next request on the service knows these users.
  void SetDirectory(const Directory& directory);

 private:
  std::shared_ptr<const Directory> GetDirectory() const;
  struct Incoming;

  Answer Respond(const Incoming& incoming, RequestRecord& record);
  Answer Process(const Incoming& incoming, RequestRecord& record);
  Answer Perform(Operation operation, const Incoming& incoming, RequestRecord& record);
  Answer Negotiate(const Incoming& incoming, const SoapMessage& message, const SecurityHeader& header,
                   const TokenRequest& request, const AuthenticationContext& context);
  std::string Grant(const SoapMessage& message, const SecurityHeader& header, const TokenRequest& request,
                    const AuthenticationContext& context);
  std::string Issue(const SoapMessage& message, const SecurityHeader& header, const TokenRequest& request,
                    const AuthenticationContext& context);
  std::string Renew(const SoapMessage& message, const SecurityHeader& header, const TokenRequest& request,
                    const AuthenticationContext& context);
  IssuedToken Sign(const AssertionContent& content, RequestRecord& record) const;
  std::string Validate(const TokenRequest& request, const AuthenticationContext& context);

  HandlerOptions _options;
  mutable std::mutex _mutex;
  std::shared_ptr<const Directory> _directory;  // Guarded by the mutex; what it points to never changes.
  TokenIssuer _issuer;
  Clock _clock;
  LogSink _log;
  ReplayGuard _replays;
  Negotiator _negotiator;
  TroubleMaker _trouble;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_REQUESTHANDLER_H
