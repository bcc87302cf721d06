// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/http/HttpException.h>
#include <pelmar/system/DateTime.h>

#include "pelmar/core/Backtrace.h"
#include "support/VirtualSlot.h"

#include <gnu/libc-version.h>
#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <sstream>
#include <string>
#include <type_traits>
#include <typeinfo>
#include <vector>

namespace Pelmar {
namespace {

struct ClassCase {
  const char* name;
  const std::type_info& type;
  std::function<std::unique_ptr<Exception>(const std::string&)> create;
  const char* prefix;
};

template <typename T>
ClassCase MakeClassCase(const char* name, const char* prefix) {
  return {name, typeid(T), [](const std::string& message) { return std::make_unique<T>(message); }, prefix};
}

const std::vector<ClassCase>& GetClassCases() {
  static const std::vector<ClassCase> cases = {
      MakeClassCase<Exception>("Pelmar::Exception", ""),
      MakeClassCase<InvalidArgumentException>("Pelmar::InvalidArgumentException", "Invalid argument : "),
      MakeClassCase<InvalidStateException>("Pelmar::InvalidStateException", ""),
      MakeClassCase<TypeMismatchException>("Pelmar::TypeMismatchException", ""),
      MakeClassCase<Base64FormatException>("Pelmar::Base64FormatException", ""),
      MakeClassCase<System::DateFormatException>("Pelmar::System::DateFormatException", ""),
      MakeClassCase<Crypto::CryptoException>("Pelmar::Crypto::CryptoException", ""),
      MakeClassCase<Http::HttpException>("Pelmar::Http::HttpException", ""),
      MakeClassCase<Http::HttpTimeoutException>("Pelmar::Http::HttpTimeoutException", ""),
  };
  return cases;
}

std::vector<std::string> SplitLines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) {
    lines.push_back(line);
  }
  return lines;
}

TEST(Exception, KeepsTheMessageOfItsClass) {
  for (const ClassCase& c : GetClassCases()) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(c.create("the reason")->what(), c.prefix + std::string("the reason"));
    EXPECT_EQ(c.create("")->what(), std::string(c.prefix));
  }
}

TEST(Exception, ClonesItsDynamicClass) {
  for (const ClassCase& c : GetClassCases()) {
    SCOPED_TRACE(c.name);
    std::unique_ptr<Exception> original = c.create("the reason");
    const std::unique_ptr<Exception> owner(original->Clone());
    const Exception& clone = *owner;
    const std::vector<void*> backtrace = original->GetBacktrace();
    original.reset();
    EXPECT_EQ(typeid(clone), c.type);
    EXPECT_EQ(clone.what(), c.prefix + std::string("the reason"));
    EXPECT_EQ(clone.GetBacktrace(), backtrace);
  }
}

TEST(Exception, ThrowsACopyOfItsDynamicClass) {
  for (const ClassCase& c : GetClassCases()) {
    SCOPED_TRACE(c.name);
    const std::unique_ptr<Exception> original = c.create("the reason");
    try {
      original->Throw();
    } catch (const Exception& thrown) {
      EXPECT_NE(&thrown, original.get());
      EXPECT_EQ(typeid(thrown), c.type);
      EXPECT_STREQ(thrown.what(), original->what());
      EXPECT_EQ(thrown.GetBacktrace(), original->GetBacktrace());
    }
  }
}

// A destructor takes two places: it is there with and without giving the memory back (Itanium C++
// ABI, 2.5.2).
TEST(Throwable, KeepsItsOperationsInTheirOrder) {
  using TestSupport::SlotOf;
  EXPECT_TRUE(std::has_virtual_destructor<Throwable>::value);
  EXPECT_EQ(SlotOf(&Throwable::what), 2);
  EXPECT_EQ(SlotOf(&Throwable::GetBacktrace), 3);
  EXPECT_EQ(SlotOf(&Throwable::Dump), 4);
  EXPECT_EQ(SlotOf(&Throwable::Where), 5);
  EXPECT_EQ(SlotOf(&Throwable::Clone), 6);
  EXPECT_EQ(SlotOf(&Throwable::Throw), 7);
}

TEST(Exception, IsAStandardException) {
  const std::unique_ptr<Exception> exception = std::make_unique<InvalidStateException>("no key");
  EXPECT_THROW(exception->Throw(), std::exception);
  EXPECT_THROW(exception->Throw(), Throwable);
  EXPECT_THROW(exception->Throw(), InvalidStateException);
}

TEST(Exception, CopiesWithoutFailing) {
  EXPECT_TRUE(std::is_nothrow_copy_constructible<Exception>::value);
  EXPECT_TRUE(std::is_nothrow_copy_constructible<InvalidArgumentException>::value);
  EXPECT_TRUE(std::is_nothrow_copy_constructible<System::DateFormatException>::value);
  EXPECT_TRUE(std::is_nothrow_copy_assignable<InvalidStateException>::value);
}

TEST(Exception, AssignsMessageAndBacktrace) {
  const InvalidArgumentException source("second");
  InvalidArgumentException target("first");
  target = source;
  EXPECT_STREQ(target.what(), "Invalid argument : second");
  EXPECT_EQ(target.GetBacktrace(), source.GetBacktrace());
}

TEST(Exception, DumpsClassMessageAndEveryFrame) {
  for (const ClassCase& c : GetClassCases()) {
    SCOPED_TRACE(c.name);
    const std::unique_ptr<Exception> exception = c.create("the reason");
    const std::vector<std::string> lines = SplitLines(exception->Dump());
    ASSERT_EQ(lines.size(), exception->GetBacktrace().size() + 1);
    EXPECT_EQ(lines[0], c.name + std::string(": ") + exception->what());
    for (std::size_t i = 0; i < exception->GetBacktrace().size(); ++i) {
      EXPECT_EQ(lines[i + 1], "  #" + std::to_string(i) + " " + DescribeFrame(exception->GetBacktrace()[i]));
    }
  }
}

TEST(Exception, RecordsTheFramesThatRaisedIt) {
  const Exception exception("here");
  EXPECT_FALSE(exception.GetBacktrace().empty());
  EXPECT_EQ(exception.Where(), DescribeRaisingFrame(exception.GetBacktrace()));
  EXPECT_FALSE(exception.Where().empty());
  EXPECT_EQ(exception.Where().find('\n'), std::string::npos);
}

// The depth is the argument so that no compiler can fold the calls into one frame.
__attribute__((noinline)) std::size_t CountFramesAtDepth(int depth) {
  const std::size_t count =
      depth == 0 ? Exception("deep").GetBacktrace().size() : CountFramesAtDepth(depth - 1);
  EXPECT_GE(depth, 0);
  return count;
}

TEST(Exception, BoundsTheBacktraceOfADeepStack) {
  EXPECT_EQ(CountFramesAtDepth(200), kMaxBacktraceFrames);
}

__attribute__((noinline)) std::vector<void*> CaptureHere(void*& here) {
  here = __builtin_return_address(0);
  return CaptureBacktrace();
}

TEST(Backtrace, BeginsWithTheCaller) {
  void* caller = nullptr;
  const std::vector<void*> frames = CaptureHere(caller);
  ASSERT_GE(frames.size(), 2u);
  EXPECT_EQ(frames[1], caller);
}

TEST(Backtrace, TellsExceptionConstructorsFromOtherFunctions) {
  EXPECT_TRUE(IsExceptionConstructor("Pelmar::Throwable::Throwable(std::string const&)"));
  EXPECT_TRUE(IsExceptionConstructor("Pelmar::Exception::Exception(std::string const&)"));
  EXPECT_TRUE(IsExceptionConstructor("Quorlin::ParseException::ParseException(std::string const&)"));
  EXPECT_TRUE(IsExceptionConstructor("HostException::HostException()"));
  EXPECT_FALSE(IsExceptionConstructor(""));
  EXPECT_FALSE(IsExceptionConstructor("main"));
  EXPECT_FALSE(IsExceptionConstructor("Pelmar::Exception::Throw() const"));
  EXPECT_FALSE(IsExceptionConstructor("Quorlin::Parser::Parser(Pelmar::Exception::Exception)"));
  EXPECT_FALSE(IsExceptionConstructor("Quorlin::ThrowParseException(std::string const&)"));
  EXPECT_FALSE(IsExceptionConstructor("Quorlin::MyException::Exception()"));
}

TEST(Backtrace, NamesFunctionAndModuleOfAFrame) {
  // A function that the loader knows by name, and that no sanitizer replaces: one byte on lies within it.
  void* const inside = reinterpret_cast<char*>(reinterpret_cast<void*>(&gnu_get_libc_version)) + 1;
  const std::string description = DescribeFrame(inside);
  EXPECT_EQ(description.substr(0, description.find('+') + 1), "gnu_get_libc_version (libc.so.6+")
      << description;
}

TEST(Backtrace, GivesTheBareAddressOutsideOfModules) {
  EXPECT_EQ(DescribeFrame(reinterpret_cast<void*>(0x10)), "0x10");
}

TEST(Backtrace, DescribesAnEmptyBacktraceAsNothing) {
  EXPECT_EQ(DescribeRaisingFrame({}), "");
}

}  // namespace
}  // namespace Pelmar
