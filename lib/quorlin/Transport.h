// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// How a finished request reaches the token service and the body of the answer comes back.

#ifndef QUORLIN_TRANSPORT_H
#define QUORLIN_TRANSPORT_H

#include <pelmar/Exception.h>
#include <pelmar/Reader.h>
#include <pelmar/Ref.h>
#include <pelmar/system/ThreadPool.h>

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "quorlin/Request.h"

namespace Quorlin {

/// Told how an exchange ended: with a failure and no body, or with a body and no failure. Both are valid
/// during the call only (the body may be kept by a `Ref`).
using ResponseCallback = boost::function<void(const Pelmar::Exception*, Pelmar::Reader*)>;

/// The exchanges of one operation. They share connections and cookies. Used by one operation at a time.
class TransportSession {
 public:
  /// Sends the request and waits for the body of the answer. Throws CommunicationException when the exchange
  /// failed.
  virtual void SendRequest(const Request& request, Pelmar::Ref<Pelmar::Reader>& response) = 0;
  /// Starts the exchange and returns at once. `callback` is called once, on a platform thread; `item` is the
  /// pending exchange, to be waited for or cancelled. A failed exchange reaches the callback as a
  /// CommunicationException.
  virtual void SendRequestAsync(const Request& request, const ResponseCallback& callback,
                                Pelmar::Ref<Pelmar::System::ScheduledItem>& item) = 0;

 protected:
  /// Not virtual: the shared pointer that the transport makes deletes the concrete class.
  ~TransportSession() = default;
};

/// Opens sessions with one token service. Immutable; may be shared between threads.
class Transport {
 public:
  virtual boost::shared_ptr<TransportSession> CreateSession() const = 0;

 protected:
  /// Not virtual: transports are held by shared pointers that were made with the concrete class.
  ~Transport() = default;
};

}  // namespace Quorlin

#endif  // QUORLIN_TRANSPORT_H
