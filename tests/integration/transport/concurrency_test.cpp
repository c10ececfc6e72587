// SPDX-License-Identifier: Apache-2.0

#include "integration/transport/service_stand_in.h"

#include <tarvel/system/thread_pool.h>

#include <gtest/gtest.h>

#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <sys/resource.h>

namespace SsoClient {
namespace {

using Testing::AskForOutcome;
using Testing::Response;
using Testing::ServerConnection;
using Testing::ServiceStandIn;

constexpr int REQUESTS = 500;

/// Counts requests that have ended, and waits for all of them.
class Tally {
public:
  void Note(bool hasSucceeded) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_succeeded += hasSucceeded ? 1 : 0;
    ++m_ended;
    m_changed.notify_all();
  }
  /// How many have succeeded, when all have ended; -1 when not all end in time.
  int WaitForAll(int count) {
    std::unique_lock<std::mutex> lock(m_mutex);
    const bool ended = m_changed.wait_for(lock, 2 * Testing::PATIENCE, [&] { return m_ended == count; });
    return ended ? m_succeeded : -1;
  }

private:
  std::mutex m_mutex;
  std::condition_variable m_changed;
  int m_succeeded = 0;
  int m_ended = 0;
};

class TransportFromAPool : public testing::TestWithParam<std::size_t> {};

TEST_P(TransportFromAPool, CompletesFiveHundredRequestsWithAnyCeiling) {
  ServiceStandIn service(Testing::AnswerWith(Response("200 OK", "<body/>")));
  Tally tally;
  const auto pool = Tarvel::System::CreateThreadPool(GetParam());
  for (int i = 0; i < REQUESTS; ++i) {
    pool->QueueWorkItem([&] { tally.Note(AskForOutcome(*service.CreateSession()) == "<body/>"); });
  }
  EXPECT_EQ(tally.WaitForAll(REQUESTS), REQUESTS);
  EXPECT_LE(pool->GetThreadCount(), GetParam());
}

INSTANTIATE_TEST_SUITE_P(Ceilings, TransportFromAPool, testing::Values(1, 2, 8, 256),
                         testing::PrintToStringParamName());

TEST(TransportFromALargePool, HasAsManyRequestsInFlightAsTheCeilingAllows) {
  constexpr int IN_FLIGHT = 256;
  std::mutex mutex;
  std::condition_variable changed;
  int waiting = 0;
  ServiceStandIn service([&](ServerConnection &connection) {
    connection.ReadRequest();
    {
      std::unique_lock<std::mutex> lock(mutex);
      ++waiting;
      changed.notify_all();
      changed.wait_for(lock, Testing::PATIENCE, [&] { return waiting >= IN_FLIGHT; });
    }
    connection.Write(Response("200 OK", "<body/>"));
  });
  Tally tally;
  const auto pool = Tarvel::System::CreateThreadPool(IN_FLIGHT);
  for (int i = 0; i < IN_FLIGHT; ++i) {
    pool->QueueWorkItem([&] { tally.Note(AskForOutcome(*service.CreateSession()) == "<body/>"); });
  }
  EXPECT_EQ(tally.WaitForAll(IN_FLIGHT), IN_FLIGHT);
}

/// Raises the soft limit on descriptors, which is usually 1024: both ends of each connection are in this process.
void AllowDescriptors(rlim_t count) {
  rlimit limit{};
  ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &limit), 0);
  if (limit.rlim_cur < count) {
    limit.rlim_cur = count;
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &limit), 0) << "this test needs " << count << " descriptors";
  }
}

TEST(TransportAsync, HasFiveHundredRequestsInFlightWithoutAThreadForEach) {
  ASSERT_NO_FATAL_FAILURE(AllowDescriptors(2 * REQUESTS + 1000));
  std::atomic<int> received{0};
  ServiceStandIn service([&](ServerConnection &connection) {
    connection.ReadRequest();
    ++received;
    Testing::Eventually([&] { return received.load() >= REQUESTS; }); // the first answer waits for the last request
    connection.Write(Response("200 OK", "<body/>"));
  });
  const auto tally = std::make_shared<Tally>(); // a completion may be later than this test
  for (int i = 0; i < REQUESTS; ++i) {
    Tarvel::Ref<Tarvel::System::ScheduledItem> item;
    service.CreateSession()->SendRequestAsync(
        Testing::SampleRequest(),
        [tally](const Tarvel::Exception *, Tarvel::Reader *response) {
          tally->Note(response && response->ReadToEnd(100) == "<body/>");
        },
        item);
  }
  EXPECT_EQ(tally->WaitForAll(REQUESTS), REQUESTS);
}

} // namespace
} // namespace SsoClient
