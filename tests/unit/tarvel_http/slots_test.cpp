// SPDX-License-Identifier: Apache-2.0

#include "support/virtual_slot.h"

#include <tarvel/http/cookie_store.h>
#include <tarvel/http/user_agent.h>
#include <tarvel/system/stream.h>

#include <gtest/gtest.h>

namespace Tarvel::Http {
namespace {

using Testing::SlotOf;

TEST(Stream, HasItsOperationsInTheDeclaredOrder) {
  const auto first = SlotOf(&System::Stream::AsyncReadSome);
  EXPECT_GT(first, 0);
  EXPECT_EQ(SlotOf(&System::Stream::AsyncWrite), first + 1);
  EXPECT_EQ(SlotOf(&System::Stream::Close), first + 2);
  EXPECT_EQ(SlotOf(&System::Stream::IsSecure), first + 3);
}

TEST(UserAgent, HasItsOperationsInTheDeclaredOrder) {
  const auto first = SlotOf(&UserAgent::StartRequest);
  EXPECT_GT(first, 0);
  EXPECT_EQ(SlotOf(&UserAgent::WaitForRequest), first + 1);
}

TEST(CookieStore, HasItsOperationsInTheDeclaredOrder) {
  const auto first = SlotOf(&CookieStore::SetFromHeader);
  EXPECT_GT(first, 0);
  EXPECT_EQ(SlotOf(&CookieStore::GetHeader), first + 1);
  EXPECT_EQ(SlotOf(&CookieStore::GetCount), first + 2);
}

TEST(ClientRequest, HasItsOperationsInTheDeclaredOrder) {
  const auto first = SlotOf(&ClientRequest::SetHeader);
  EXPECT_GT(first, 0);
  EXPECT_EQ(SlotOf(&ClientRequest::WriteBody), first + 1);
}

} // namespace
} // namespace Tarvel::Http
