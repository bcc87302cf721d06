// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// How the calls of a service object are made: how long they may take, what ends them, whether they are tried
// again, and by which way they go.

#ifndef QUORLIN_SERVICEOPTIONS_H
#define QUORLIN_SERVICEOPTIONS_H

#include <pelmar/Ref.h>
#include <pelmar/system/CancellationHandle.h>
#include <quorlin/Export.h>
#include <quorlin/SecurityTokenService.h>
#include <quorlin/SecurityTokenServiceConfig.h>

#include <boost/shared_ptr.hpp>

#include <string>

namespace Quorlin {

/// The longest `ServiceOptions::timeoutMicroseconds` and `maxRetryDelayMicroseconds`: a day.
enum OperationLimit : long long { kMaxOperationMicroseconds = 24LL * 60 * 60 * 1000000 };

/// The most that `ServiceOptions::maxRetries` may be.
enum RetryLimit : int { kMaxRetries = 10 };

/// What CreateSecurityTokenService may be told beside the configuration. A plain value; it is copied, and
/// wipes its password. As it is made, only the time-out differs from that of a service without options, which
/// allows four minutes for each message of a negotiation.
///
/// A client certificate for TLS is no option: `SecurityTokenServiceConfig::sslContext` is the one place for
/// it (Pelmar::Ssl::SSLContextOptions).
struct QUORLIN_API ServiceOptions {
  ServiceOptions();
  /// Wipes the proxy's password.
  ~ServiceOptions();
  ServiceOptions(const ServiceOptions& other);
  /// Wipes the password that was there.
  ServiceOptions& operator=(const ServiceOptions& other);

  /// How long a whole operation may take: all messages of a negotiation, what its handler does in between,
  /// and all retries. From 1 to kMaxOperationMicroseconds; default: 240000000, four minutes. An asynchronous
  /// operation's time counts from when a thread takes it up.
  long long timeoutMicroseconds;

  /// How long name look-up, TCP, the proxy's answer to CONNECT and the TLS handshake may take together. From
  /// 1 to Pelmar::Http::kMaxConnectTimeoutMicroseconds, rounded up to milliseconds; default: 240000000.
  long long connectTimeoutMicroseconds;

  /// Ends the operations that run when it is cancelled, and those that are started later, with a
  /// CommunicationException, "The operation was cancelled."; at any stage but while a NegotiationHandler is
  /// at work. An operation whose answer has come may still succeed. Null, the default: nothing does.
  Pelmar::Ref<Pelmar::System::CancellationHandle> cancellation;

  /// How often a message is sent again that cannot have reached the service, because the connection was
  /// refused or the TLS handshake was broken off or not completed in `connectTimeoutMicroseconds`; nothing
  /// else is ever sent again. From 0, the default, to kMaxRetries.
  int maxRetries;
  /// The pause before the first retry, from 1 to `maxRetryDelayMicroseconds`; default: 200000. Each further
  /// one is twice as long. A retry that could only come after the time-out is not waited for.
  long long retryDelayMicroseconds;
  /// What pauses grow to at most; up to kMaxOperationMicroseconds. Default: 5000000.
  long long maxRetryDelayMicroseconds;

  /// "http://HOST:PORT" of an HTTP proxy to go through, by CONNECT to a service with https:. Empty, the
  /// default: none, whatever the environment says.
  std::string proxyUrl;
  /// Credentials for the proxy (Basic authentication). They go unencrypted to it.
  std::string proxyUser;
  std::string proxyPassword;

  /// The text of the HTTP header User-Agent: visible ASCII characters, and blanks in between. Empty, the
  /// default: no such header.
  std::string userAgent;
};

/// A client of the service that `config` describes, whose operations obey `options`. Nothing is sent yet.
/// Throws what the form without options throws, and Pelmar::InvalidArgumentException for options that are out
/// of bounds, Pelmar::Http::HttpException for a malformed proxy URL.
QUORLIN_API boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(
    const SecurityTokenServiceConfig& config, const ServiceOptions& options);

/// The same client once more, whose operations `cancellation` ends too: to cancel single operations, give
/// each a handle of its own. Cheap: both share everything, also the TLS sessions to resume. `service` must
/// have been made with options, else Pelmar::InvalidArgumentException; so must the handle not be null.
QUORLIN_API boost::shared_ptr<SecurityTokenService> CreateCancellableService(
    const SecurityTokenService& service, const Pelmar::Ref<Pelmar::System::CancellationHandle>& cancellation);

}  // namespace Quorlin

#endif  // QUORLIN_SERVICEOPTIONS_H
