// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A token that is always there: kept, and replaced in time.
//
// It lives in a library of its own, libquorlin-provider, so that libquorlin needs neither lock nor timer.

#ifndef QUORLIN_TOKENPROVIDER_H
#define QUORLIN_TOKENPROVIDER_H

#include <quorlin/Export.h>
#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenService.h>
#include <quorlin/TokenProviderOptions.h>
#include <quorlin/TokenRequest.h>

#include <boost/shared_ptr.hpp>

namespace Quorlin {

/// Keeps one token and hands it out; gets the next one in the background before it is needed.
///
/// A token is *fresh* while it holds for `minimumLifeSec` more, and *valid* until its end. What GetToken()
/// gives:
/// - the kept token, at once, while it is fresh;
/// - otherwise a new one, which is waited for. However many callers wait, there is one request;
/// - the kept token, valid but no longer fresh, when the new one could not be got: a failure of the service
///   fails no caller before the token's end. Once a try has failed, callers do not even wait for the next.
///   This is the one case in which a token with less than `minimumLifeSec` left is handed out;
/// - else the exception of the last try, with its dynamic type: to all who waited for it, and at once,
/// without
///   a request, to all who call before the next try is due.
///
/// The new token is the old one's renewal where the old one is valid, renewable and holder-of-key; when the
/// service answers but will not renew, and in all other cases, it is asked for anew. A new token that is not
/// fresh counts as a failure. Failed tries are repeated in the background, at growing intervals.
/// InvalidCredentialsException ends that, so that no account is locked by our knocking: nothing is asked any
/// more until Invalidate(). Nothing is asked before the first call either.
///
/// Ownership: by `boost::shared_ptr`. Destroying the provider waits for nothing: requests on their way end on
/// their own, and nobody hears of them; callers that wait get Pelmar::InvalidStateException.
///
/// Threads: any number of threads may call one provider at once. A caller that needs a new token makes the
/// request itself, on its own thread, unless one is on its way. A fresh token costs a clock reading and a
/// lock that is held for the copy of a pointer; a refresh on its way does not touch it.
class QUORLIN_API TokenProvider {
 public:
  /// A token as told above; never null. Throws what the request throws: see SecurityTokenService. An
  /// exception that does not derive from Pelmar::Exception arrives as a Pelmar::Exception with its text.
  virtual boost::shared_ptr<const SamlToken> GetToken() = 0;
  /// The same without waiting: returns at once, and calls `done` once, on a thread of the scheduler, perhaps
  /// before it has returned. Throws Pelmar::InvalidArgumentException for an empty function.
  virtual void GetTokenAsync(const TokenCompletion& done) = 0;
  /// Forgets the token and the last failure: the next call makes a new request, and automatic retries are
  /// allowed again. A token that was asked for before is handed to nobody any more, though its request is
  /// waited for, so that there is one at a time. To be called when passwords have changed, for example.
  virtual void Invalidate() = 0;
  /// The same if `rejected` is the token that is kept (by its ID), and otherwise nothing. To be called when
  /// somebody has refused the token: when many threads find that out together, the first does it, and the
  /// others do not throw the next token away.
  virtual void InvalidateToken(const SamlToken& rejected) = 0;

 protected:
  /// Not virtual: the shared pointer that the factory makes deletes the concrete class.
  ~TokenProvider() {}
};

/// A provider of tokens that `request` asks `service` for. Nothing is sent yet. Throws
/// Pelmar::InvalidArgumentException for a null service, an empty request, or an option out of its range.
QUORLIN_API boost::shared_ptr<TokenProvider> CreateTokenProvider(
    const boost::shared_ptr<const SecurityTokenService>& service, const TokenRequest& request,
    const TokenProviderOptions& options);

}  // namespace Quorlin

#endif  // QUORLIN_TOKENPROVIDER_H
