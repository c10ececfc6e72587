// SPDX-License-Identifier: Apache-2.0

#include "operation_events.h"

#include <gtest/gtest.h>

namespace SsoClient::Tool {
namespace {

TEST(EventText, OfAStartIsTheOperationAndItsId) {
  EXPECT_EQ("started AcquireToken 1b4e28ba", EventText(OperationInfo{"1b4e28ba", "AcquireToken"}));
}

TEST(EventText, OfARequestIsItsActionAndSize) {
  EXPECT_EQ("request: urn:issue, 812 octets", EventText(RequestSentEvent{"urn:issue", 812, 0}));
  EXPECT_EQ("request: urn:issue, 1 octet, leg 2", EventText(RequestSentEvent{"urn:issue", 1, 2}));
}

TEST(EventText, OfAResponseIsItsStatusTypeSizeAndTime) {
  EXPECT_EQ("response: 500 Internal Server Error, text/xml, 812 octets, 35 ms",
            EventText(ResponseReceivedEvent{500, "Internal Server Error", "text/xml", 812, 35'999, 0}));
  EXPECT_EQ("response: 200 OK, no content type, 0 octets, 0 ms, leg 1",
            EventText(ResponseReceivedEvent{200, "OK", "", 0, 999, 1}));
}

TEST(EventText, OfAMissingResponseIsTheReason) {
  EXPECT_EQ("response: none, Connection refused, 2 ms",
            EventText(ResponseReceivedEvent{0, "Connection refused", "", 0, 2000, 0}));
}

TEST(EventText, OfAFaultIsItsResolvedNameAndItsText) {
  EXPECT_EQ("fault: {urn:a}Failed (ns1:Failed): no; detail: more",
            EventText(FaultEvent{"urn:a", "Failed", "ns1:Failed", "no", "more"}));
  EXPECT_EQ("fault: {urn:a}Failed (ns1:Failed): no", EventText(FaultEvent{"urn:a", "Failed", "ns1:Failed", "no", ""}));
  EXPECT_EQ("fault: nobody:Failed: no", EventText(FaultEvent{"", "Failed", "nobody:Failed", "no", ""}));
}

TEST(EventText, OfAnEndIsTheOutcomeAndTheTime) {
  EXPECT_EQ("ended: succeeded after 36 ms",
            EventText(OperationEndedEvent{OperationEndedEvent::Outcome::SUCCEEDED, "", "", 36'000}));
  EXPECT_EQ("ended: failed InvalidCredentialsException after 36 ms",
            EventText(OperationEndedEvent{OperationEndedEvent::Outcome::FAILED, "InvalidCredentialsException", "no",
                                          36'000}));
}

TEST(ObserverFor, IsNullUnlessTheOutputIsVerbose) {
  EXPECT_EQ(nullptr, ObserverFor({Format::TEXT, false}));
  EXPECT_NE(nullptr, ObserverFor({Format::TEXT, true}));
}

} // namespace
} // namespace SsoClient::Tool
