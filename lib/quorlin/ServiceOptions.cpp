// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/StringUtil.h>
#include <quorlin/ServiceOptions.h>

#include "quorlin/HttpsClient.h"

namespace Quorlin {

ServiceOptions::ServiceOptions()
    : timeoutMicroseconds(kServiceTimeoutMicroseconds),
      connectTimeoutMicroseconds(kServiceTimeoutMicroseconds),
      maxRetries(0),
      retryDelayMicroseconds(200000),
      maxRetryDelayMicroseconds(5000000) {}

ServiceOptions::~ServiceOptions() {
  Pelmar::StringUtil::Wipe(proxyPassword);
}

ServiceOptions::ServiceOptions(const ServiceOptions& other) = default;

ServiceOptions& ServiceOptions::operator=(const ServiceOptions& other) {
  if (this != &other) {
    // The longer text may get other memory, and would leave the old one as it is.
    Pelmar::StringUtil::Wipe(proxyPassword);
    timeoutMicroseconds = other.timeoutMicroseconds;
    connectTimeoutMicroseconds = other.connectTimeoutMicroseconds;
    cancellation = other.cancellation;
    maxRetries = other.maxRetries;
    retryDelayMicroseconds = other.retryDelayMicroseconds;
    maxRetryDelayMicroseconds = other.maxRetryDelayMicroseconds;
    proxyUrl = other.proxyUrl;
    proxyUser = other.proxyUser;
    proxyPassword = other.proxyPassword;
    userAgent = other.userAgent;
  }
  return *this;
}

}  // namespace Quorlin
