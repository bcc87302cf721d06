// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What an action came to, as one text that a test can compare whole.

#ifndef QUORLIN_TESTS_SUPPORT_VERDICT_H
#define QUORLIN_TESTS_SUPPORT_VERDICT_H

#include <pelmar/Exception.h>

#include <boost/core/demangle.hpp>

#include <memory>
#include <string>
#include <typeinfo>

namespace TestSupport {

/// The exact class with its namespace, ": " and the whole message.
inline std::string Describe(const Pelmar::Exception& error) {
  return boost::core::demangle(typeid(error).name()) + ": " + error.what();
}

/// "accepted" when `action` returns; else what `Describe` says of the exception, after "pointer to " when it
/// was thrown by pointer (it is then deleted). Exceptions that are not the platform's pass through.
template <typename Action>
std::string VerdictOf(Action action) {
  try {
    action();
  } catch (const Pelmar::Exception& error) {
    return Describe(error);
  } catch (Pelmar::Exception* error) {
    const std::unique_ptr<Pelmar::Exception> owner(error);
    return "pointer to " + Describe(*error);
  }
  return "accepted";
}

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_VERDICT_H
