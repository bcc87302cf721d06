// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What of a client's wishes is granted.

#ifndef QUORLIN_DEVSTS_GRANT_H
#define QUORLIN_DEVSTS_GRANT_H

#include "devsts/Assertion.h"
#include "devsts/Authentication.h"
#include "devsts/Directory.h"
#include "devsts/TokenRequest.h"

namespace DevSts {

/// The service's limits, in seconds.
struct LifetimeLimits {
  /// Longer wishes are cut down to it.
  long long maxSec = 24 * 60 * 60;
  /// For a client that names no lifetime.
  long long defaultSec = 10 * 60;
};

/// The content of a token for `caller` as `request` asks, at `now` (microseconds since the epoch). The
/// lifetime is cut down to the limits and to that of what the caller presented; everything else is granted as
/// it was asked for or refused. Throws Fault.
AssertionContent Grant(const Caller& caller, const TokenRequest& request, const LifetimeLimits& limits,
                       const Directory& directory, long long now);

/// `content` made valid from `now` for as long as `request` asks, with one renewal less to come and what the
/// directory now knows of `user`. Throws Fault when it may not be renewed.
AssertionContent GrantRenewal(AssertionContent content, const User& user, const TokenRequest& request,
                              const LifetimeLimits& limits, long long now);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_GRANT_H
