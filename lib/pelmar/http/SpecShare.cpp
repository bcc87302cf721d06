// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/SpecShare.h"

#include "pelmar/http/CurlHandles.h"

#include <pelmar/http/HttpException.h>

namespace Pelmar {
namespace Http {

namespace {

ShareHandle CreateShare() {
  ShareHandle share(curl_share_init());
  // One thread uses it, so it needs no lock functions.
  if (!share || curl_share_setopt(share.get(), CURLSHOPT_SHARE, CURL_LOCK_DATA_SSL_SESSION) != CURLSHE_OK ||
      curl_share_setopt(share.get(), CURLSHOPT_SHARE, CURL_LOCK_DATA_DNS) != CURLSHE_OK) {
    throw HttpException("The HTTP engine cannot be set up");
  }
  return share;
}

}  // namespace

const SharedState& SpecShare::Get(Seconds now) {
  if (!_state.handle || _state.expiry->HasPassed(now)) {
    // Exchanges that run keep the old one.
    _state.handle = CreateShare();
    _state.expiry->Reset();
  }
  return _state;
}

}  // namespace Http
}  // namespace Pelmar
