// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Keeps an exception for those who wait for it.

#ifndef QUORLIN_PROVIDER_FAILURE_H
#define QUORLIN_PROVIDER_FAILURE_H

#include <pelmar/Exception.h>

#include <memory>

namespace Quorlin {

using Failure = std::shared_ptr<const Pelmar::Exception>;

/// What is kept when there is no memory to keep anything else. Never null. To be called once before failures
/// are kept, while there is memory to make it.
const Failure& GetOutOfMemoryFailure();

/// A copy, with its dynamic type, of the exception that is being handled. Of one that does not derive from
/// Pelmar::Exception a Pelmar::Exception that tells its text. Never null. To be called in a handler.
Failure KeepCurrentException() noexcept;

}  // namespace Quorlin

#endif  // QUORLIN_PROVIDER_FAILURE_H
