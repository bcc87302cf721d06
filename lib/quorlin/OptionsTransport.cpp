// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/OptionsTransport.h"

#include <pelmar/MessageFormatter.h>
#include <pelmar/service/Logger.h>
#include <quorlin/Exceptions.h>

#include <boost/make_shared.hpp>

#include <algorithm>
#include <string>

#include "quorlin/OperationFrame.h"
#include "quorlin/cancellation.h"
#include "quorlin/logging.h"

namespace Quorlin {

namespace Http = Pelmar::Http;

using Pelmar::System::CancellationHandle;
using Pelmar::System::ScheduledItem;

namespace {

void Require(bool condition, const std::string& fault) {
  if (!condition) {
    throw Pelmar::InvalidArgumentException(fault);
  }
}

void RequireBounds(const ServiceOptions& options) {
  const std::string upToADay =
      " is not from 1 to " + std::to_string(kMaxOperationMicroseconds) + " microseconds";
  Require(options.timeoutMicroseconds >= 1 && options.timeoutMicroseconds <= kMaxOperationMicroseconds,
          "the operations' time-out" + upToADay);
  Require(options.maxRetries >= 0 && options.maxRetries <= kMaxRetries,
          "the number of retries is not from 0 to " + std::to_string(kMaxRetries));
  Require(options.maxRetryDelayMicroseconds >= 1 &&
              options.maxRetryDelayMicroseconds <= kMaxOperationMicroseconds,
          "the longest pause before a retry" + upToADay);
  Require(options.retryDelayMicroseconds >= 1 &&
              options.retryDelayMicroseconds <= options.maxRetryDelayMicroseconds,
          "the pause before the first retry is not from 1 microsecond to the longest pause");
}

Http::ClientOptions MakeClientOptions(const ServiceOptions& options) {
  Http::ClientOptions client;
  client.connectTimeoutMicroseconds = options.connectTimeoutMicroseconds;
  client.proxyUrl = options.proxyUrl;
  client.proxyUser = options.proxyUser;
  client.proxyPassword = options.proxyPassword;
  client.userAgent = options.userAgent;
  return client;
}

SessionSettings MakeSettings(const SecurityTokenServiceConfig& config, const ServiceOptions& options) {
  RequireBounds(options);
  SessionSettings settings = {
      MakeHttpsEndpoint(config.stsUrl, config.sslContext.Get(), config.sslConnectionParam),
      MakeClientOptions(options),
      options.timeoutMicroseconds,
      options.maxRetries,
      options.retryDelayMicroseconds,
      options.maxRetryDelayMicroseconds,
      {}};
  if (options.cancellation) {
    settings.cancellations.push_back(options.cancellation);
  }
  return settings;
}

Pelmar::Ref<Http::UserAgent> CreateUserAgent(const SessionSettings& settings) {
  const Pelmar::Ref<Http::CookieStore> cookies = Http::CreateCookieStore(std::string());
  return Http::CreateHttpUserAgent(settings.endpoint.spec, cookies, nullptr, settings.client);
}

// Seconds in decimal, with as many digits as needed.
std::string FormatSeconds(long long microseconds) {
  constexpr long long kMicrosecondsPerSecond = 1000000;
  constexpr int kDigits = 6;
  std::string fraction = std::to_string(microseconds % kMicrosecondsPerSecond);
  fraction.insert(0, static_cast<std::size_t>(kDigits) - fraction.size(), '0');
  fraction.erase(fraction.find_last_not_of('0') + 1);
  return std::to_string(microseconds / kMicrosecondsPerSecond) + (fraction.empty() ? "" : "." + fraction);
}

// What is waited for, for as long as that lasts.
class Attachment final {
 public:
  Attachment(const Pelmar::Ref<CancellationHandle>& handle, const Pelmar::Ref<ScheduledItem>& item)
      : _handle(handle), _item(item) {
    _handle->Attach(_item);
  }
  Attachment(const Attachment&) = delete;
  Attachment& operator=(const Attachment&) = delete;
  ~Attachment() { _handle->Detach(_item); }

 private:
  const Pelmar::Ref<CancellationHandle> _handle;
  const Pelmar::Ref<ScheduledItem> _item;
};

// The blocking path takes the outcome from the user agent, not from the functor.
void IgnoreOutcome(const Pelmar::Exception*, Http::ClientResponse*, Http::PendingRequestItem*) {}

}  // namespace

long long GetRetryDelay(const SessionSettings& settings, int retry) {
  long long delay = settings.retryDelayMicroseconds;
  for (int i = 0; i < retry && delay < settings.maxRetryDelayMicroseconds; ++i) {
    delay *= 2;
  }
  return std::min(delay, settings.maxRetryDelayMicroseconds);
}

// ---- The session ----

OptionsSession::OptionsSession(const SessionSettings& settings)
    : _settings(settings),
      _deadline(Clock::now() + std::chrono::microseconds(settings.timeoutMicroseconds)),
      _cancellation(Pelmar::System::CreateCancellationHandle()),
      _userAgent(CreateUserAgent(settings)) {
  for (const Pelmar::Ref<CancellationHandle>& handle : _settings.cancellations) {
    handle->Attach(_cancellation);
  }
}

OptionsSession::~OptionsSession() {
  for (const Pelmar::Ref<CancellationHandle>& handle : _settings.cancellations) {
    handle->Detach(_cancellation);
  }
}

void OptionsSession::RequireGoingOn() const {
  if (_cancellation->IsCancelled()) {
    throw CommunicationException(kCancelledText);
  }
  if (GetRemainingMicroseconds() == 0) {
    throw CommunicationException("The operation took longer than " +
                                 FormatSeconds(_settings.timeoutMicroseconds) + " s.");
  }
}

void OptionsSession::SendRequest(const Request& request, Pelmar::Ref<Pelmar::Reader>& response) {
  for (int retry = 0;; ++retry) {
    RequireGoingOn();
    if (retry > 0) {
      OperationFrame::CountRetry();
    }
    Pelmar::Ref<Http::PendingRequestItem> item;
    _userAgent->SendAsync(CreatePost(_settings.endpoint.path, request), &IgnoreOutcome, item);
    const boost::shared_ptr<Pelmar::Exception> failure = Exchange(item, response);
    if (!failure) {
      return;
    }
    // Whatever the exchange failed with then: that is what the host wanted, or what took too long.
    RequireGoingOn();
    if (!AwaitRetry(item, *failure, retry)) {
      failure->Throw();
    }
  }
}

boost::shared_ptr<Pelmar::Exception> OptionsSession::Exchange(
    const Pelmar::Ref<Http::PendingRequestItem>& item, Pelmar::Ref<Pelmar::Reader>& response) {
  const Attachment attachment(_cancellation, item);
  boost::shared_ptr<Pelmar::Exception> failure;
  try {
    Pelmar::Ref<Http::ClientResponse> answer;
    _userAgent->WaitFor(item, GetRemainingMicroseconds(), answer);
    TranslateResponse(nullptr, answer.Get(), failure, response);
  } catch (const Pelmar::Exception& error) {
    TranslateResponse(&error, nullptr, failure, response);
  }
  return failure;
}

bool OptionsSession::AwaitRetry(const Pelmar::Ref<Http::PendingRequestItem>& item,
                                const Pelmar::Exception& failure, int retry) {
  const long long delay = GetRetryDelay(_settings, retry);
  if (retry >= _settings.maxRetries || !Http::IsSafeToRetry(item) || delay >= GetRemainingMicroseconds()) {
    return false;
  }
  Pelmar::Service::LogInternal(getLogger(), kLogLevelInfo, "Nothing was sent: %1; retry %2 follows",
                               Pelmar::StringFormatter(failure.what()), Pelmar::IntegerFormatter(retry + 1));
  _cancellation->Wait(delay);
  return true;
}

void OptionsSession::SendRequestAsync(const Request& request, const ResponseCallback& callback,
                                      Pelmar::Ref<ScheduledItem>& item) {
  const Pelmar::Ref<CancellationHandle> cancellation = _cancellation;
  const auto complete = [cancellation, callback](const Pelmar::Exception* error,
                                                 Http::ClientResponse* response,
                                                 Http::PendingRequestItem* pending) {
    cancellation->Detach(pending);
    const CommunicationException cancelled(kCancelledText);
    const bool isCancelled = error != nullptr && cancellation->IsCancelled();
    AsyncTranslateResponse(callback, isCancelled ? &cancelled : error, response, pending);
  };
  Pelmar::Ref<Http::PendingRequestItem> pending;
  _userAgent->SendAsync(CreatePost(_settings.endpoint.path, request), complete, pending);
  item = pending;
  _cancellation->Attach(item);
}

// Rounded up, so that who waited for so long is late.
long long OptionsSession::GetRemainingMicroseconds() const {
  const auto remaining = std::chrono::ceil<std::chrono::microseconds>(_deadline - Clock::now());
  return std::max<long long>(remaining.count(), 0);
}

// ---- The transport ----

OptionsTransport::OptionsTransport(const SecurityTokenServiceConfig& config, const ServiceOptions& options)
    : _settings(MakeSettings(config, options)) {
  // Refuses what is wrong with the options while the host is still there to hear of it.
  CreateUserAgent(_settings);
}

boost::shared_ptr<TransportSession> OptionsTransport::CreateSession() const {
  const boost::shared_ptr<OptionsSession> session = boost::make_shared<OptionsSession>(_settings);
  // Now, before a negotiation's handler is asked for its first message.
  session->RequireGoingOn();
  return session;
}

boost::shared_ptr<const OptionsTransport> OptionsTransport::WithCancellation(
    const Pelmar::Ref<CancellationHandle>& cancellation) const {
  const boost::shared_ptr<OptionsTransport> copy = boost::make_shared<OptionsTransport>(*this);
  copy->_settings.cancellations.push_back(cancellation);
  return copy;
}

}  // namespace Quorlin
