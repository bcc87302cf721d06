// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Reader.h>
#include <pelmar/Writer.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace {

std::string ReadAll(Reader& reader, std::size_t step) {
  std::string text;
  std::vector<char> buffer(step);
  for (std::size_t count = 0; (count = reader.Read(buffer.data(), step)) > 0;) {
    EXPECT_LE(count, step);
    text.append(buffer.data(), count);
  }
  return text;
}

TEST(StringReader, GivesTheWholeTextInStepsOfAnySize) {
  const std::string text("bytes\0of every \xFF kind\n", 22);
  for (const std::size_t step : {1u, 2u, 7u, 22u, 100u}) {
    EXPECT_EQ(ReadAll(*CreateStringReader(text), step), text) << step;
  }
}

TEST(StringReader, StaysAtTheEnd) {
  const Ref<Reader> reader = CreateStringReader("x");
  char buffer[4] = {};
  EXPECT_EQ(reader->Read(buffer, sizeof buffer), 1u);
  EXPECT_EQ(reader->Read(buffer, sizeof buffer), 0u);
  EXPECT_EQ(reader->Read(buffer, sizeof buffer), 0u);
}

TEST(StringReader, ReadsNothingFromAnEmptyText) {
  char buffer = 'x';
  EXPECT_EQ(CreateStringReader("")->Read(&buffer, 1), 0u);
  EXPECT_EQ(buffer, 'x');
}

TEST(StringReader, KeepsItsPlaceWhenAskedForNothing) {
  const Ref<Reader> reader = CreateStringReader("x");
  char buffer = ' ';
  EXPECT_EQ(reader->Read(&buffer, 0), 0u);
  EXPECT_EQ(reader->Read(&buffer, 1), 1u);
  EXPECT_EQ(buffer, 'x');
}

TEST(StringReader, ReadsItsOwnCopy) {
  std::string text = "before";
  const Ref<Reader> reader = CreateStringReader(text);
  text = "after!";
  EXPECT_EQ(ReadAll(*reader, 3), "before");
}

TEST(StringWriter, CollectsWhatItIsGiven) {
  const Ref<StringWriter> writer = CreateStringWriter();
  EXPECT_EQ(writer->GetText(), "");
  writer->Write("a\0b", 3);
  writer->Write(nullptr, 0);
  writer->Write("cd", 2);
  EXPECT_EQ(writer->GetText(), std::string("a\0bcd", 5));
}

}  // namespace
}  // namespace Pelmar
