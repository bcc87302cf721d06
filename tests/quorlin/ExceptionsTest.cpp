// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/Exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <type_traits>
#include <typeinfo>
#include <vector>

namespace Quorlin {
namespace {

constexpr const char* kMessage = "Some message: with a colon, %1 and \xC3\xA9";

struct ClassCase {
  const char* name;
  const std::type_info& type;
  std::unique_ptr<Pelmar::Exception> (*create)();
  // Which handlers catch it, of those for SsoException, InvalidTokenException, InvalidSignatureException,
  // ParseException, CommunicationException and InvalidCredentialsException.
  std::vector<bool> caughtBy;
};

template <typename T>
std::unique_ptr<Pelmar::Exception> Create() {
  return std::make_unique<T>(kMessage);
}

template <typename T>
ClassCase MakeCase(const char* name, const std::vector<bool>& caughtBy) {
  static_assert(sizeof(T) == sizeof(Pelmar::Exception), "no class adds a field");
  static_assert(std::is_nothrow_copy_constructible<T>::value, "an exception is copied while it is thrown");
  return {name, typeid(T), &Create<T>, caughtBy};
}

std::vector<ClassCase> Cases() {
  return {
      MakeCase<SsoException>("SsoException", {true, false, false, false, false, false}),
      MakeCase<InvalidTokenException>("InvalidTokenException", {true, true, false, false, false, false}),
      MakeCase<InvalidSignatureException>("InvalidSignatureException",
                                          {true, true, true, false, false, false}),
      MakeCase<ParseException>("ParseException", {true, true, false, true, false, false}),
      MakeCase<CommunicationException>("CommunicationException", {true, false, false, false, true, false}),
      MakeCase<InvalidCredentialsException>("InvalidCredentialsException",
                                            {true, false, false, false, false, true}),
  };
}

// Whether throwing `exception` through its base ends in a handler for `T`.
template <typename T>
bool IsCaughtBy(const Pelmar::Exception& exception) {
  bool isCaught = false;
  try {
    exception.Throw();
  } catch (const T&) {
    isCaught = true;
  } catch (...) {
    // Some other handler's business.
  }
  return isCaught;
}

TEST(Exceptions, KeepTheMessageUnchanged) {
  for (const ClassCase& c : Cases()) {
    EXPECT_STREQ(kMessage, c.create()->what()) << c.name;
  }
}

TEST(Exceptions, CloneKeepsClassAndMessageAndOutlivesTheOriginal) {
  for (const ClassCase& c : Cases()) {
    std::unique_ptr<Pelmar::Exception> original = c.create();
    const std::unique_ptr<Pelmar::Exception> clone(original->Clone());
    original.reset();
    const Pelmar::Exception& copy = *clone;
    EXPECT_EQ(c.type, typeid(copy)) << c.name;
    EXPECT_STREQ(kMessage, copy.what()) << c.name;
  }
}

TEST(Exceptions, ThrowThrowsACopyOfTheDynamicClass) {
  for (const ClassCase& c : Cases()) {
    const std::unique_ptr<Pelmar::Exception> original = c.create();
    try {
      original->Throw();
    } catch (const Pelmar::Exception& thrown) {
      EXPECT_EQ(c.type, typeid(thrown)) << c.name;
      EXPECT_NE(original.get(), &thrown) << c.name;
      EXPECT_STREQ(kMessage, thrown.what()) << c.name;
    }
  }
}

TEST(Exceptions, AreCaughtByTheHandlersOfTheirFamilyOnly) {
  for (const ClassCase& c : Cases()) {
    const std::unique_ptr<Pelmar::Exception> exception = c.create();
    const std::vector<bool> caughtBy = {IsCaughtBy<SsoException>(*exception),
                                        IsCaughtBy<InvalidTokenException>(*exception),
                                        IsCaughtBy<InvalidSignatureException>(*exception),
                                        IsCaughtBy<ParseException>(*exception),
                                        IsCaughtBy<CommunicationException>(*exception),
                                        IsCaughtBy<InvalidCredentialsException>(*exception)};
    EXPECT_EQ(c.caughtBy, caughtBy) << c.name;
  }
}

TEST(Exceptions, AreStandardExceptionsToo) {
  for (const ClassCase& c : Cases()) {
    EXPECT_TRUE(IsCaughtBy<std::exception>(*c.create())) << c.name;
  }
}

TEST(Exceptions, ClonedTwiceStillHaveTheirClass) {
  for (const ClassCase& c : Cases()) {
    const std::unique_ptr<Pelmar::Exception> original = c.create();
    const std::unique_ptr<Pelmar::Exception> first(original->Clone());
    const std::unique_ptr<Pelmar::Exception> second(first->Clone());
    const Pelmar::Exception& copy = *second;
    EXPECT_EQ(c.type, typeid(copy)) << c.name;
  }
}

}  // namespace
}  // namespace Quorlin
