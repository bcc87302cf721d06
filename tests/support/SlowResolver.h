// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A name look-up that does not end by itself.

#ifndef QUORLIN_TESTS_SUPPORT_SLOWRESOLVER_H
#define QUORLIN_TESTS_SUPPORT_SLOWRESOLVER_H

namespace TestSupport {

/// The host whose look-up waits. While a SlowResolver lives, getaddrinfo() of the whole process blocks for
/// this name until that goes, and then fails; without one it fails at once. All other names are looked up as
/// ever.
extern const char* const kSlowHost;

class SlowResolver final {
 public:
  SlowResolver();
  SlowResolver(const SlowResolver&) = delete;
  SlowResolver& operator=(const SlowResolver&) = delete;
  /// Lets all look-ups end, and waits for that.
  ~SlowResolver();

  /// Blocks until somebody looks the name up.
  void AwaitLookUp();
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_SLOWRESOLVER_H
