// SPDX-License-Identifier: Apache-2.0

#include "exchange/request.h"

#include "exchange/spnego_response.h"

#include <gtest/gtest.h>

#include <utility>

namespace SsoClient {
namespace {

TEST(Request, StartsWithTwoEmptyTexts) {
  const Request request;
  EXPECT_EQ(request.soapAction, "");
  EXPECT_EQ(request.body, "");
}

TEST(Request, HasFourActions) {
  EXPECT_STREQ(Request::ISSUE, "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue");
  EXPECT_STREQ(Request::RENEW, "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Renew");
  EXPECT_STREQ(Request::VALIDATE, "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate");
  EXPECT_STREQ(Request::CHALLANGE, "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue");
}

TEST(Request, CopiesMovesAndAssignsBothTexts) {
  Request original;
  original.soapAction = Request::RENEW;
  original.body = std::string(100, 'x');
  const Request copy = original;
  EXPECT_EQ(copy.soapAction, Request::RENEW);
  EXPECT_EQ(copy.body, original.body);
  Request target;
  target.body = "earlier";
  target = copy;
  EXPECT_EQ(target.body, std::string(100, 'x'));
  const Request moved = std::move(original);
  EXPECT_EQ(moved.body, std::string(100, 'x'));
}

TEST(SPNegoResponse, StartsEmpty) {
  const SPNegoResponse response;
  EXPECT_EQ(response.contextId, "");
  EXPECT_TRUE(response.leg.empty());
  EXPECT_EQ(response.tokenXml, "");
}

TEST(Request, KeepsWhetherItDeclaresItsCharsetWhenItIsAssigned) {
  Request declaring;
  declaring.declaresCharset = true;
  Request assigned;
  assigned = declaring;
  EXPECT_TRUE(assigned.declaresCharset);
}

} // namespace
} // namespace SsoClient
