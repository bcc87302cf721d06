// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/xml/QName.h>

#include <gtest/gtest.h>

namespace Pelmar {
namespace Xml {
namespace {

TEST(QName, IsEmptyByDefault) {
  EXPECT_EQ(QName().GetNamespace(), "");
  EXPECT_EQ(QName().GetLocalName(), "");
  EXPECT_EQ(QName().ToString(), "");
}

TEST(QName, PrintsNamespaceAndLocalName) {
  EXPECT_EQ(QName("urn:a", "b").ToString(), "urn:a:b");
}

TEST(QName, PrintsTheLocalNameAloneWithoutNamespace) {
  EXPECT_EQ(QName("", "b").ToString(), "b");
}

TEST(QName, ComparesBothMembersExactly) {
  EXPECT_TRUE(QName("urn:a", "b") == QName("urn:a", "b"));
  EXPECT_FALSE(QName("urn:a", "b") != QName("urn:a", "b"));
  for (const QName& other : {QName("urn:A", "b"), QName("urn:a", "B"), QName("", "b"), QName("urn:a", "")}) {
    EXPECT_FALSE(QName("urn:a", "b") == other) << other.ToString();
    EXPECT_TRUE(QName("urn:a", "b") != other) << other.ToString();
  }
}

}  // namespace
}  // namespace Xml
}  // namespace Pelmar
