// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/message_formatter.h>
#include <tarvel/xml/qname.h>

#include <gtest/gtest.h>

namespace Tarvel::Xml {
namespace {

TEST(QName, IsEqualWhenBothTextsAre) {
  EXPECT_EQ(QName("urn:a", "x"), QName("urn:a", "x"));
  EXPECT_NE(QName("urn:a", "x"), QName("urn:A", "x"));
  EXPECT_NE(QName("urn:a", "x"), QName("urn:a", "y"));
}

TEST(QName, OrdersByNamespaceFirst) {
  EXPECT_LT(QName("urn:a", "y"), QName("urn:b", "x"));
  EXPECT_LT(QName("urn:a", "x"), QName("urn:a", "y"));
  EXPECT_FALSE(QName("urn:a", "x") < QName("urn:a", "x"));
}

TEST(QName, ShowsItsNamespaceInBraces) {
  EXPECT_EQ(QName("urn:a", "x").ToString(), "{urn:a}x");
  EXPECT_EQ(QName("", "x").ToString(), "x");
}

TEST(QName, IsAMessageArgument) {
  EXPECT_EQ(MessageFormatter::ASPrint("<%1>", QName("urn:a", "x")), "<{urn:a}x>");
}

} // namespace
} // namespace Tarvel::Xml
