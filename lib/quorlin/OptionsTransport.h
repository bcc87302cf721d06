// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The transport whose sessions obey the options of a service.

#ifndef QUORLIN_OPTIONSTRANSPORT_H
#define QUORLIN_OPTIONSTRANSPORT_H

#include <pelmar/Exception.h>
#include <pelmar/Reader.h>
#include <pelmar/Ref.h>
#include <pelmar/http/Client.h>
#include <pelmar/http/ClientOptions.h>
#include <pelmar/system/CancellationHandle.h>
#include <quorlin/SecurityTokenServiceConfig.h>
#include <quorlin/ServiceOptions.h>

#include <boost/shared_ptr.hpp>

#include <chrono>
#include <vector>

#include "quorlin/HttpsClient.h"
#include "quorlin/Transport.h"

namespace Quorlin {

/// What the sessions of one transport have in common. Immutable, but for the handles, which are shared.
struct SessionSettings {
  HttpsEndpoint endpoint;
  Pelmar::Http::ClientOptions client;
  long long timeoutMicroseconds;
  int maxRetries;
  long long retryDelayMicroseconds;
  long long maxRetryDelayMicroseconds;
  std::vector<Pelmar::Ref<Pelmar::System::CancellationHandle>> cancellations;
};

/// The pause before the retry of this number, counted from 0: `settings`' delay, doubled each time up to the
/// longest. In microseconds.
long long GetRetryDelay(const SessionSettings& settings, int retry);

/// One operation. Its time runs from its construction. It has a cancellation handle of its own, which the
/// host's handles cancel and on which it waits.
class OptionsSession final : public TransportSession {
 public:
  explicit OptionsSession(const SessionSettings& settings);
  OptionsSession(const OptionsSession&) = delete;
  OptionsSession& operator=(const OptionsSession&) = delete;
  /// Lets go of the host's handles.
  ~OptionsSession();

  /// Throws CommunicationException when the operation is cancelled or its time is over.
  void RequireGoingOn() const;

  void SendRequest(const Request& request, Pelmar::Ref<Pelmar::Reader>& response) override;
  /// Is cancelled like `SendRequest`, but is not tried again, and has as much time as whoever waits gives it.
  void SendRequestAsync(const Request& request, const ResponseCallback& callback,
                        Pelmar::Ref<Pelmar::System::ScheduledItem>& item) override;

 private:
  using Clock = std::chrono::steady_clock;

  // Null when the exchange succeeded.
  boost::shared_ptr<Pelmar::Exception> Exchange(const Pelmar::Ref<Pelmar::Http::PendingRequestItem>& item,
                                                Pelmar::Ref<Pelmar::Reader>& response);
  // Whether to send again; waits until then.
  bool AwaitRetry(const Pelmar::Ref<Pelmar::Http::PendingRequestItem>& item, const Pelmar::Exception& failure,
                  int retry);
  long long GetRemainingMicroseconds() const;

  const SessionSettings _settings;
  const Clock::time_point _deadline;
  const Pelmar::Ref<Pelmar::System::CancellationHandle> _cancellation;
  const Pelmar::Ref<Pelmar::Http::UserAgent> _userAgent;
};

/// Posts requests to one URL.
class OptionsTransport final : public Transport {
 public:
  /// Throws what HttpsClient throws, and for options what `CreateSecurityTokenService` does.
  OptionsTransport(const SecurityTokenServiceConfig& config, const ServiceOptions& options);

  /// Throws CommunicationException when the operation has been cancelled already.
  boost::shared_ptr<TransportSession> CreateSession() const override;

  /// The same, with another handle that cancels.
  boost::shared_ptr<const OptionsTransport> WithCancellation(
      const Pelmar::Ref<Pelmar::System::CancellationHandle>& cancellation) const;

 private:
  SessionSettings _settings;
};

}  // namespace Quorlin

#endif  // QUORLIN_OPTIONSTRANSPORT_H
