// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "torture/HostFaults.h"

#include "torture/BlockTable.h"

#include <dlfcn.h>
#include <execinfo.h>
#include <pthread.h>
#include <sched.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>

extern "C" {
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* memory, std::size_t size);
void* __libc_memalign(std::size_t alignment, std::size_t size);
void __libc_free(void* memory);
}

namespace {

using Torture::Extent;

/// Counts requests, and tells which of them are to fail.
struct Plan {
  std::atomic<std::size_t> made;
  std::atomic<std::size_t> first;  // 0: none fails.
  std::atomic<bool> isForAll;
  std::atomic<bool> hasFailed;

  void Start(std::size_t number, Extent extent) {
    made = 0;
    hasFailed = false;
    isForAll = extent == Extent::ALL_FROM_THEN;
    first = number;
  }

  bool Stop() {
    first = 0;
    return hasFailed;
  }

  bool IsToFail() noexcept {
    const std::size_t wanted = first.load(std::memory_order_relaxed);
    if (wanted == 0) {
      return false;
    }
    const std::size_t number = ++made;
    const bool fails = isForAll ? number >= wanted : number == wanted;
    hasFailed = hasFailed || fails;
    return fails;
  }
};

// Zero from the start of the process, as memory is asked for before any constructor has run.
Plan allocations;
Plan threadStarts;
Torture::BlockTable held;
thread_local bool isServer = false;

std::atomic<const void*> failedCaller;
std::atomic<bool> isNotingCallers;

bool MayAllocate(const void* caller) noexcept {
  if (isServer || !allocations.IsToFail()) {
    return true;
  }
  if (isNotingCallers) {
    void* callers[32];
    dprintf(STDERR_FILENO, "request failed, made by:\n");
    backtrace_symbols_fd(callers, backtrace(callers, 32), STDERR_FILENO);
  }
  failedCaller = caller;
  errno = ENOMEM;
  return false;
}

void* Take(void* memory, const void* caller) noexcept {
  if (memory != nullptr && !isServer) {
    held.Add(memory, caller);
  }
  return memory;
}

struct ThreadStart {
  void* (*run)(void*);
  void* argument;
  bool isServer;
};

void* RunThread(void* start) {
  const ThreadStart own = *static_cast<ThreadStart*>(start);
  __libc_free(start);
  isServer = own.isServer;
  return own.run(own.argument);
}

using CreateFunction = int (*)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*);

}  // namespace

extern "C" {

void* malloc(std::size_t size) {
  return MayAllocate(__builtin_return_address(0)) ? Take(__libc_malloc(size), __builtin_return_address(0))
                                                  : nullptr;
}

void* calloc(std::size_t count, std::size_t size) {
  return MayAllocate(__builtin_return_address(0))
             ? Take(__libc_calloc(count, size), __builtin_return_address(0))
             : nullptr;
}

void* realloc(void* memory, std::size_t size) {
  if (!MayAllocate(__builtin_return_address(0))) {
    return nullptr;
  }
  // Out of the table first: as soon as it is free another thread may get it.
  held.Remove(memory);
  void* const result = __libc_realloc(memory, size);
  Take(result == nullptr && size != 0 ? memory : result, __builtin_return_address(0));
  return result;
}

void* memalign(std::size_t alignment, std::size_t size) {
  return MayAllocate(__builtin_return_address(0))
             ? Take(__libc_memalign(alignment, size), __builtin_return_address(0))
             : nullptr;
}

void* aligned_alloc(std::size_t alignment, std::size_t size) {
  return memalign(alignment, size);
}

int posix_memalign(void** memory, std::size_t alignment, std::size_t size) {
  void* const result = memalign(alignment, size);
  if (result == nullptr) {
    return ENOMEM;
  }
  *memory = result;
  return 0;
}

void free(void* memory) {
  if (memory != nullptr) {
    held.Remove(memory);
    __libc_free(memory);
  }
}

// Named, as our own symbols are hidden: the other libraries are to find it.
__attribute__((visibility("default"))) int pthread_create(pthread_t* thread, const pthread_attr_t* attributes,
                                                          void* (*run)(void*), void* argument) {
  static const auto create = reinterpret_cast<CreateFunction>(dlsym(RTLD_NEXT, "pthread_create"));
  if (!isServer && threadStarts.IsToFail()) {
    return EAGAIN;
  }
  auto* const start = static_cast<ThreadStart*>(__libc_malloc(sizeof(ThreadStart)));
  *start = {run, argument, isServer};
  const int error = create(thread, attributes, RunThread, start);
  if (error != 0) {
    __libc_free(start);
  }
  return error;
}

}  // extern "C"

namespace Torture {

namespace {

/// Our code asks for memory by operator new alone.
bool IsOwn(const void* caller) {
  Dl_info info = {};
  return dladdr(caller, &info) != 0 && info.dli_fname != nullptr &&
         std::strstr(info.dli_fname, "/libstdc++") != nullptr;
}

}  // namespace

ServerScope::ServerScope() : _before(isServer) {
  isServer = true;
}

ServerScope::~ServerScope() {
  isServer = _before;
}

void FailAllocation(std::size_t number, Extent extent) {
  allocations.Start(number, extent);
}

bool StopFailingAllocations() {
  return allocations.Stop();
}

std::size_t CountHeldBlocks() {
  return held.Count();
}

std::size_t AwaitHeldBlocks(std::size_t wanted) {
  constexpr std::chrono::milliseconds kAWhile(50);
  const auto end = std::chrono::steady_clock::now() + kAWhile;
  while (held.Count() > wanted && std::chrono::steady_clock::now() < end) {
    sched_yield();
  }
  return held.Count();
}

std::size_t CountOwnBlocks() {
  return held.Count(IsOwn);
}

bool WasFailedBelow() {
  return !IsOwn(failedCaller);
}

void NoteCallers() {
  // The first call loads a library, and asks for memory itself.
  void* caller = nullptr;
  backtrace(&caller, 1);
  isNotingCallers = true;
  held.NoteCallers();
}

std::size_t CountAskedFor() {
  return held.CountAdded();
}

void WriteCallersSince(std::size_t count) {
  held.WriteCallersSince(count);
}

void FailThreadStart(std::size_t number, Extent extent) {
  threadStarts.Start(number, extent);
}

bool StopFailingThreadStarts() {
  return threadStarts.Stop();
}

}  // namespace Torture
