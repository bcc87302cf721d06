// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Ends calls from outside: made by whoever may want to, and given to the calls that shall obey.

#ifndef PELMAR_SYSTEM_CANCELLATIONHANDLE_H
#define PELMAR_SYSTEM_CANCELLATIONHANDLE_H

#include <pelmar/Export.h>
#include <pelmar/Ref.h>
#include <pelmar/system/ThreadPool.h>

namespace Pelmar {
namespace System {

/// A switch that is thrown once. One handle may end any number of calls, those that start later included; to
/// go on afterwards, make a new one.
///
/// Ownership: shared, by `Ref`. A call holds on to what it needs, so the handle may be released at any time,
/// and cancelled long after the calls are over. A handle owns what is attached to it until that is detached
/// or cancelled.
///
/// Threads: every method may be called from any thread, also by completions of the calls it ends; not from a
/// signal handler, since it locks.
class PELMAR_API CancellationHandle : public ScheduledItem {
 public:
  /// Cancels what is attached now, and from now on whatever is attached later. Returns at once; the calls end
  /// by themselves soon afterwards. Does nothing the second time.
  void Cancel() override = 0;

  virtual bool IsCancelled() const = 0;

  /// Blocks until `Cancel` is called or `timeoutMicroseconds` have passed; true when it is cancelled. A
  /// negative time-out waits without end.
  bool Wait(long long timeoutMicroseconds) override = 0;

  /// Has `Cancel` cancel `item` too; at once if that has been called. Another handle may be attached, which
  /// is then cancelled with this one, but not the other way round; never a handle to itself, nor in a circle.
  /// An item that is attached stays so however often that is done. Throws InvalidArgumentException for a null
  /// item.
  virtual void Attach(const Ref<ScheduledItem>& item) = 0;

  /// Undoes `Attach`; does nothing if `item` is not attached. A `Cancel` that is under way on another thread
  /// may still reach the item, which it keeps alive for that long.
  virtual void Detach(const Ref<ScheduledItem>& item) = 0;

 protected:
  ~CancellationHandle() override;
};

/// A handle that nobody has cancelled.
PELMAR_API Ref<CancellationHandle> CreateCancellationHandle();

}  // namespace System
}  // namespace Pelmar

#endif  // PELMAR_SYSTEM_CANCELLATIONHANDLE_H
