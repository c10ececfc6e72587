// SPDX-License-Identifier: Apache-2.0

#include "support/virtual_slot.h"

#include <ssoclient/security_token_service.h>

#include <gtest/gtest.h>

#include <type_traits>

namespace SsoClient {
namespace {

using Testing::SlotOf;

static_assert(!std::has_virtual_destructor_v<SecurityTokenService>);

TEST(SecurityTokenService, HasItsOperationsInTheDeclaredOrder) {
  EXPECT_EQ(SlotOf(&SecurityTokenService::AcquireToken), 1);
  EXPECT_EQ(SlotOf(&SecurityTokenService::AcquireTokenByGSS), 2);
  EXPECT_EQ(SlotOf(&SecurityTokenService::AcquireTokenByCertificate), 3);
  EXPECT_EQ(SlotOf(&SecurityTokenService::AcquireTokenByToken), 4);
  EXPECT_EQ(SlotOf(&SecurityTokenService::ValidateSubject), 5);
  EXPECT_EQ(SlotOf(&SecurityTokenService::RenewToken), 6);
  EXPECT_EQ(SlotOf(&SecurityTokenService::AcquireTokenAsync), 7);
  EXPECT_EQ(SlotOf(&SecurityTokenService::AcquireTokenByGssAsync), 8);
  EXPECT_EQ(SlotOf(&SecurityTokenService::AcquireTokenByCertificateAsync), 9);
  EXPECT_EQ(SlotOf(&SecurityTokenService::AcquireTokenByTokenAsync), 10);
  EXPECT_EQ(SlotOf(&SecurityTokenService::ValidateSubjectAsync), 11);
  EXPECT_EQ(SlotOf(&SecurityTokenService::RenewTokenAsync), 12);
}

TEST(SlotOf, IsZeroForAFunctionThatIsNotVirtual) {
  struct Plain {
    void Run() {}
  };
  EXPECT_EQ(SlotOf(&Plain::Run), 0);
}

} // namespace
} // namespace SsoClient
