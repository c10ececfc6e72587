// SPDX-License-Identifier: Apache-2.0

#include "exchange/request_builder.h"
#include "exchange/response_handler.h"
#include "transport/transport.h"

#include "support/virtual_slot.h"

#include <gtest/gtest.h>

#include <type_traits>

namespace SsoClient {
namespace {

using Testing::SlotOf;

template <typename... Classes>
constexpr bool HAS_NO_VIRTUAL_DESTRUCTOR = (!std::has_virtual_destructor_v<Classes> && ...);

static_assert(HAS_NO_VIRTUAL_DESTRUCTOR<RequestBuilder, ResponseHandler, TransportSession, Transport>);

TEST(RequestBuilder, HasItsOperationsInTheDeclaredOrder) {
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildUserPassTokenRequest), 1);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildInitialSPNegoRequest), 2);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildContinuedSPNegoRequest), 3);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildCertificateTokenRequest), 4);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildExchangeTokenRequest), 5);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildValidateSubjectRequest), 6);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildRenewRequest), 7);
}

TEST(ResponseHandler, HasItsOperationsInTheDeclaredOrder) {
  EXPECT_EQ(SlotOf(&ResponseHandler::HandleAcquireTokenResponse), 1);
  EXPECT_EQ(SlotOf(&ResponseHandler::HandleValidateSubjectResponse), 2);
  EXPECT_EQ(SlotOf(&ResponseHandler::HandleRenewTokenResponse), 3);
  EXPECT_EQ(SlotOf(&ResponseHandler::HandleSPNegoResponse), 4);
}

TEST(TransportSession, HasItsOperationsInTheDeclaredOrder) {
  EXPECT_EQ(SlotOf(&TransportSession::SendRequest), 1);
  EXPECT_EQ(SlotOf(&TransportSession::SendRequestAsync), 2);
}

TEST(Transport, HasOneOperation) {
  EXPECT_EQ(SlotOf(&Transport::CreateSession), 1);
}

} // namespace
} // namespace SsoClient
