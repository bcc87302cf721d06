// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Calls a function of the host so that its exceptions are ours.

#ifndef PELMAR_CRYPTO_HOSTFUNCTION_H
#define PELMAR_CRYPTO_HOSTFUNCTION_H

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>

#include <exception>
#include <string>

namespace Pelmar {
namespace Crypto {

/// What `function` returns. An exception below Pelmar::Exception passes as it is, so that the host meets its
/// own class again; any other one would escape from an asynchronous call, so it becomes a CryptoException of
/// `failure` and its text.
template <typename Function>
auto CallHost(const char* failure, const Function& function) {
  try {
    return function();
  } catch (const Exception&) {
    throw;
  } catch (const std::exception& error) {
    throw CryptoException(std::string(failure) + ": " + error.what());
  } catch (...) {
    throw CryptoException(std::string(failure) + " with something that is no exception");
  }
}

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_HOSTFUNCTION_H
