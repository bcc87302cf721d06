// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Memory and threads that run out when a test says so. This program's malloc and pthread_create stand before
// the C library's, so that operator new, OpenSSL, expat and libcurl meet them too.

#ifndef QUORLIN_TESTS_TORTURE_HOSTFAULTS_H
#define QUORLIN_TESTS_TORTURE_HOSTFAULTS_H

#include <cstddef>

namespace Torture {

/// While it lives, this thread and the threads that it starts, and those that these start, belong to a
/// server: they are never failed, and what they hold is not counted. Threads that were started keep that for
/// good.
class ServerScope final {
 public:
  ServerScope();
  ServerScope(const ServerScope&) = delete;
  ServerScope& operator=(const ServerScope&) = delete;
  ~ServerScope();

 private:
  const bool _before;
};

enum class Extent {
  ONE,           ///< One request fails.
  ALL_FROM_THEN  ///< That one fails and all after it.
};

/// From now on fails the `number`-th (from 1) request for memory of the client's threads together.
void FailAllocation(std::size_t number, Extent extent);
/// No request fails any more. Whether one did.
bool StopFailingAllocations();

/// The blocks that the client's threads have got since the process began and that are not given back.
std::size_t CountHeldBlocks();
/// The same, as soon as there are no more than `wanted`, or after a while: the HTTP loop's thread gives back
/// what a call took shortly after the call has returned, and nobody is told when.
std::size_t AwaitHeldBlocks(std::size_t wanted);

/// How many of those held were asked for by operator new, and not by a C library below ours.
std::size_t CountOwnBlocks();
/// Whether the last request that was failed did not come from operator new.
bool WasFailedBelow();

/// For finding a fault: from now on writes to standard error who made a request that is failed, notes who
/// asked for each block ...
void NoteCallers();
/// ... and how many there have been so far ...
std::size_t CountAskedFor();
/// ... and writes to standard error who asked for those held that came after `count` others.
void WriteCallersSince(std::size_t count);

/// From now on fails the `number`-th (from 1) start of a thread by the client's threads, with EAGAIN.
void FailThreadStart(std::size_t number, Extent extent);
/// No start fails any more. Whether one did.
bool StopFailingThreadStarts();

}  // namespace Torture

#endif  // QUORLIN_TESTS_TORTURE_HOSTFAULTS_H
