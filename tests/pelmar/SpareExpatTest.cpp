// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SpareExpat.h"

#include <pelmar/xml/Parser.h>

#include "support/XmlText.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>

namespace Pelmar {
namespace Xml {
namespace {

TEST(SpareExpat, IsTheOneThatWasKept) {
  ExpatHandle first = TakeExpat();
  const XML_Parser parser = first.get();
  KeepExpat(std::move(first), 10);
  EXPECT_EQ(TakeExpat().get(), parser);
}

TEST(SpareExpat, IsWithOneUserAtATime) {
  KeepExpat(CreateExpat(), 10);
  const ExpatHandle outer = TakeExpat();
  const ExpatHandle inner = TakeExpat();
  EXPECT_NE(inner.get(), outer.get());
}

TEST(SpareExpat, IsNotKeptAfterALongText) {
  KeepExpat(CreateExpat(), kMaxBytesOfSpareExpat);
  EXPECT_NE(TakeExpat(), nullptr);
  ExpatHandle parser = CreateExpat();
  XML_SetUserData(parser.get(), this);
  KeepExpat(std::move(parser), kMaxBytesOfSpareExpat + 1);
  EXPECT_EQ(XML_GetUserData(TakeExpat().get()), nullptr);
}

TEST(SpareExpat, HasNoHandlerOfItsLastUser) {
  int calls = 0;
  ExpatHandle parser = CreateExpat();
  XML_SetUserData(parser.get(), &calls);
  XML_SetElementHandler(
      parser.get(), [](void* user, const XML_Char*, const XML_Char**) { ++*static_cast<int*>(user); },
      nullptr);
  ASSERT_EQ(XML_Parse(parser.get(), "<a/>", 4, XML_TRUE), XML_STATUS_OK);
  KeepExpat(std::move(parser), 4);

  const ExpatHandle again = TakeExpat();
  ASSERT_EQ(XML_Parse(again.get(), "<b/>", 4, XML_TRUE), XML_STATUS_OK);
  EXPECT_EQ(calls, 1);
}

std::string RefusalOf(const std::string& text) {
  try {
    TestSupport::ParseXmlText(text);
  } catch (const XMLParseException& error) {
    return error.what();
  }
  return "accepted";
}

// Whatever was read before, a document is judged as by a new tokeniser, which a new thread has.
TEST(SpareExpat, JudgesEveryDocumentAsANewOneDoes) {
  const std::string documents[] = {"<a/>",
                                   "<?xml version='1.0'?>\n<a xmlns:p='urn:p'>\n <p:b/></a>",
                                   "<a",
                                   "<a>\n\n&undefined;</a>",
                                   "<!DOCTYPE a [<!ENTITY undefined 'x'>]><a/>",
                                   "<a x='1' x='2'/>",
                                   "<?xml version='1.0' encoding='latin1'?><a/>",
                                   "<a/><b/>",
                                   ""};
  for (const std::string& before : documents) {
    for (const std::string& text : documents) {
      std::string ofNewThread;
      std::thread([&] { ofNewThread = RefusalOf(text); }).join();
      RefusalOf(before);
      EXPECT_EQ(RefusalOf(text), ofNewThread) << before << " then " << text;
    }
  }
}

}  // namespace
}  // namespace Xml
}  // namespace Pelmar
