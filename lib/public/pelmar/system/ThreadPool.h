// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The process-wide pool of threads that runs queued work, and the handle of something that will finish later.

#ifndef PELMAR_SYSTEM_THREADPOOL_H
#define PELMAR_SYSTEM_THREADPOOL_H

#include <pelmar/Export.h>
#include <pelmar/Object.h>

#include <boost/function.hpp>

namespace Pelmar {
namespace System {

/// Something that was started and finishes on its own. Safe to use from any thread.
class PELMAR_API ScheduledItem : public Object {
 public:
  /// Blocks until the item is done or `timeoutMicroseconds` have passed; true when it is done. A negative
  /// time-out waits without end.
  virtual bool Wait(long long timeoutMicroseconds) = 0;
  /// Asks the item to stop. An item that is done stays as it is. Returns at once.
  virtual void Cancel() = 0;

 protected:
  ~ScheduledItem() override;
};

/// Runs work items on threads of its own.
///
/// It starts with the first item, grows while its threads are all busy (up to 256) and shrinks again when
/// they idle. Items start in the order they were queued. An exception that escapes an item is written to the
/// platform's log (logger "Pelmar", level LOG_ERROR) and the pool lives on. Items still queued when the
/// process exits are destroyed without being run, as are those queued later; items that run are waited for,
/// so an item that never ends keeps the process from ending.
class PELMAR_API ThreadPool {
 public:
  /// Runs a copy of `work` on a pool thread, some time after or even before this call returns. May be called
  /// by items too. An empty function is refused with InvalidArgumentException; Exception when the pool has no
  /// thread and none can be started.
  virtual void Queue(const boost::function<void()>& work) = 0;

 protected:
  ~ThreadPool() {}
};

/// The pool of the process. Never null.
PELMAR_API ThreadPool* GetThreadPool();

}  // namespace System
}  // namespace Pelmar

#endif  // PELMAR_SYSTEM_THREADPOOL_H
