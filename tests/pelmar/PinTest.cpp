// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/Pin.h"
#include "support/TemporaryDirectory.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

namespace {

using namespace Pelmar::Crypto;
using TestSupport::TemporaryDirectory;

std::string Ask(const PinFunction& askPin) {
  try {
    return Pin(askPin).Get();
  } catch (const CryptoException& error) {
    return error.what();
  }
}

std::string ReadFrom(const std::string& content) {
  const TemporaryDirectory files;
  return Ask(ReadPinFrom(files.WriteFile("pin", content)));
}

constexpr const char* kUnfit = "The PIN is empty, has more than 255 bytes, or holds a zero byte";

TEST(Pin, IsWhatTheFunctionGives) {
  EXPECT_EQ(Ask([] { return std::string("1234"); }), "1234");
  EXPECT_EQ(Ask([] { return std::string(kMaxPinBytes, '1'); }), std::string(255, '1'));
}

TEST(Pin, RefusesWhatNoTokenCanHave) {
  EXPECT_EQ(Ask([] { return std::string(); }), kUnfit);
  EXPECT_EQ(Ask([] { return std::string(kMaxPinBytes + 1, '1'); }), kUnfit);
  EXPECT_EQ(Ask([] {
              return std::string(
                  "12\0"
                  "34",
                  5);
            }),
            kUnfit);
}

TEST(Pin, TellsWhyTheFunctionFailed) {
  EXPECT_EQ(Ask([]() -> std::string { throw std::runtime_error("nobody is there"); }),
            "The PIN cannot be had: nobody is there");
  EXPECT_EQ(Ask([]() -> std::string { throw 1; }),
            "The PIN cannot be had with something that is no exception");
  EXPECT_THROW(Pin([]() -> std::string { throw Pelmar::InvalidStateException("locked"); }),
               Pelmar::InvalidStateException);
}

TEST(Pin, IsReadFromAFileWithoutOneLineEnd) {
  EXPECT_EQ(ReadFrom("1234"), "1234");
  EXPECT_EQ(ReadFrom("1234\n"), "1234");
  EXPECT_EQ(ReadFrom("1234\r\n"), "1234");
  EXPECT_EQ(ReadFrom("1234\n\n"), "1234\n");
  EXPECT_EQ(ReadFrom(std::string(kMaxPinBytes, '1') + "\r\n"), std::string(255, '1'));
}

TEST(Pin, RefusesAFileWithoutAPin) {
  EXPECT_EQ(ReadFrom(""), kUnfit);
  EXPECT_EQ(ReadFrom("\n"), kUnfit);
  EXPECT_EQ(ReadFrom(std::string(kMaxPinBytes + 1, '1')), kUnfit);
}

TEST(Pin, RefusesAFileThatCannotBeUsed) {
  const TemporaryDirectory files;
  const std::string huge = files.WriteFile("huge", std::string(100000, '1'));
  EXPECT_EQ(Ask(ReadPinFrom(huge)), "The PIN file '" + huge + "' cannot be used: it is too long");
  const std::string missing = files.GetPath("missing");
  EXPECT_EQ(Ask(ReadPinFrom(missing)),
            "The PIN file '" + missing + "' cannot be used: No such file or directory");
  const std::string directory = files.GetPath("");
  EXPECT_EQ(Ask(ReadPinFrom(directory)), "The PIN file '" + directory + "' cannot be used: Is a directory");
}

TEST(Pin, IsReadAnewEachTime) {
  const TemporaryDirectory files;
  const PinFunction askPin = ReadPinFrom(files.WriteFile("pin", "1234"));
  EXPECT_EQ(Ask(askPin), "1234");
  files.WriteFile("pin", "4321");
  EXPECT_EQ(Ask(askPin), "4321");
}

}  // namespace
