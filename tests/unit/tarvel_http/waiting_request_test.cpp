// SPDX-License-Identifier: Apache-2.0
// How much memory a request occupies while it waits. A process may have ten thousand of them.

#include "user_agent_fixture.h"

#include "support/allocated_bytes.h"
#include "support/completion.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <utility>
#include <vector>

namespace Tarvel::Http {
namespace {

/// A stream whose operations never end, except when it is closed.
class SilentStream final : public System::Stream {
public:
  void AsyncReadSome(char *, std::size_t, TransferHandler handler) override { m_read = std::move(handler); }
  void AsyncWrite(const char *, std::size_t length, TransferHandler handler) override {
    boost::asio::post(System::GetIoContext(), [handler, length] { handler(length, nullptr); });
  }
  void Close() noexcept override {
    if (m_read) {
      boost::asio::post(System::GetIoContext(), [read = std::exchange(m_read, nullptr)] {
        const System::NetworkException closed("closed");
        read(0, &closed);
      });
    }
  }

private:
  TransferHandler m_read;
};

class SilentSpec final : public OneStreamSpec {
public:
  SilentSpec() : OneStreamSpec(nullptr) {}
  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    boost::asio::post(System::GetIoContext(), [completion] { completion(MakeRef<SilentStream>(), nullptr); });
    return {};
  }
};

TEST_F(UserAgentTest, NeedsAtMostTenKilobytesForARequestThatWaitsForItsResponse) {
  constexpr std::size_t REQUESTS = 100;
  constexpr std::size_t MAX_BYTES = 10 * 1024;
  const Ref<UserAgent> agent = CreateHttpUserAgent(MakeRef<SilentSpec>(), m_cookies);
  std::vector<Ref<PendingRequestItem>> pending(REQUESTS);
  const std::size_t before = Testing::CountAllocatedBytes();
  for (Ref<PendingRequestItem> &item : pending) {
    agent->StartRequest(Post(), nullptr, item);
  }
  ASSERT_TRUE(Testing::DrainIoThreads()); // all have connected
  ASSERT_TRUE(Testing::DrainIoThreads()); // all are written
  for (const Ref<PendingRequestItem> &item : pending) {
    ASSERT_TRUE(item->HasConnected());
    ASSERT_FALSE(item->IsDone());
  }
  EXPECT_LE((Testing::CountAllocatedBytes() - before) / REQUESTS, MAX_BYTES);
  for (const Ref<PendingRequestItem> &item : pending) {
    item->Cancel();
  }
  ASSERT_TRUE(Testing::DrainIoThreads());
}

} // namespace
} // namespace Tarvel::Http
