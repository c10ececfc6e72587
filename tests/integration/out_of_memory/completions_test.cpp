// SPDX-License-Identifier: Apache-2.0
// A completion must be called wherever memory runs out: each allocation of an exchange fails in turn. Everything runs on the
// test's thread, in a fixed order.
#include "integration/out_of_memory/failing_heap.h"
#include "transport/https_session.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/ssl/ssl_context.h>

#include <gtest/gtest.h>

#include <cstring>
#include <limits>
#include <new>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Tarvel::Exception;
using Tarvel::Ref;
using Tarvel::System::ScheduledItem;
using Tarvel::System::Stream;
using Testing::FailingHeap;
using Testing::Shortage;

constexpr long NEVER = std::numeric_limits<long>::max();

const char ANSWER[] = "HTTP/1.1 200 OK\r\nSet-Cookie: name=value-that-is-too-long-for-the-string-itself\r\n"
                      "Transfer-Encoding: chunked\r\n\r\n20\r\n0123456789012345678901234567890\n\r\n0\r\n\r\n";
const char REFUSAL[] = "HTTP/1.1 503 Not available, for a reason that is too long for the string itself\r\n\r\n";

/// Completes operations when the test says so, and allocates no memory for that.
class ScriptedStream final : public Stream {
public:
  explicit ScriptedStream(const char *answer) : m_rest(answer) {}

  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override {
    m_buffer = buffer;
    m_length = length;
    m_read = std::move(handler);
  }
  void AsyncWrite(const char *, std::size_t length, TransferHandler handler) override {
    m_written = length;
    m_write = std::move(handler);
  }
  void Close() noexcept override { m_isClosed = true; }

  /// Completes what is pending; false when nothing was.
  bool Advance(const Exception &closed) {
    if (m_write) {
      std::exchange(m_write, nullptr)(m_isClosed ? 0 : m_written, m_isClosed ? &closed : nullptr);
      return true;
    }
    if (m_read) {
      const std::size_t count = m_isClosed ? 0 : m_rest.substr(0, 30).copy(m_buffer, m_length);
      m_rest.remove_prefix(count);
      std::exchange(m_read, nullptr)(count, m_isClosed ? &closed : nullptr);
      return true;
    }
    return false;
  }

private:
  std::string_view m_rest;
  TransferHandler m_read;
  TransferHandler m_write;
  char *m_buffer = nullptr;
  std::size_t m_length = 0;
  std::size_t m_written = 0;
  bool m_isClosed = false;
};

class ScriptedSpec final : public Tarvel::Http::CustomConnectionSpec {
public:
  explicit ScriptedSpec(const Ref<Stream> &stream) : m_stream(stream) {}
  std::string ToString() const override { return "scripted"; }
  std::string GetHost() const override { return "a-name-that-is-too-long-for-the-string-itself.example"; }
  std::string GetEndpointString() const override { return GetHost() + ":8080"; }
  bool IsReuseOnAuthErrorSupported() const override { return false; }
  Ref<ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    m_completion = std::move(completion);
    return nullptr;
  }
  void Connect(const Exception *failure) const {
    if (m_completion) {
      std::exchange(m_completion, nullptr)(failure ? nullptr : m_stream, failure);
    }
  }

private:
  const Ref<Stream> m_stream;
  mutable ConnectCompletion m_completion;
};

struct Outcome {
  int calls = 0;
  bool succeeded = false;
  bool hasFailed = false;      // an allocation
  bool ranOutOfMemory = false; // by the class of the exception or, if there is memory again, by its text
};

/// Sends a request with that many successful allocations. `calls` is -1 when the start itself failed.
Outcome SendWith(long allocations, Shortage shortage, const char *answer, const Exception *connectFailure) {
  const Tarvel::System::NetworkException closed("closed");
  const auto stream = Tarvel::MakeRef<ScriptedStream>(answer);
  const auto spec = Tarvel::MakeRef<ScriptedSpec>(stream);
  HttpsSession session(spec, "/", 1);
  Request request;
  request.body = "<a-request-that-is-too-long-for-the-string-itself/>";
  Outcome outcome;
  const TransportSession::Completion completion = [&outcome](const Exception *failure, Tarvel::Reader *response) {
    ++outcome.calls;
    EXPECT_NE(failure == nullptr, response == nullptr);
    outcome.succeeded = response != nullptr;
    outcome.ranOutOfMemory = dynamic_cast<const Tarvel::OutOfMemoryException *>(failure) != nullptr ||
                             (failure && std::strcmp(failure->what(), "There is not enough memory") == 0);
  };
  Ref<ScheduledItem> item;
  FailingHeap heap(allocations, shortage);
  try {
    session.SendRequestAsync(request, completion, item);
    spec->Connect(connectFailure);
    while (stream->Advance(closed)) {
    }
  } catch (const std::bad_alloc &) {
    heap.End();
    EXPECT_EQ(outcome.calls, 0);
    EXPECT_FALSE(item) << "what was started let an exception out";
    spec->Connect(connectFailure);
    outcome.calls = outcome.calls == 0 ? -1 : outcome.calls;
  }
  heap.End();
  outcome.hasFailed = heap.HasFailed();
  return outcome;
}

/// Lets memory run out later and later, until there is enough.
void ExpectOneCallWhereverMemoryRunsOut(Shortage shortage, const char *answer, const Exception *connectFailure,
                                        bool succeeds) {
  SendWith(NEVER, shortage, answer, connectFailure); // makes what is made once per process
  bool started = false;
  for (long allocations = 0;; ++allocations) {
    SCOPED_TRACE(allocations);
    ASSERT_LT(allocations, 10000);
    const Outcome outcome = SendWith(allocations, shortage, answer, connectFailure);
    ASSERT_TRUE(outcome.calls == 1 || (!started && outcome.calls == -1)) << outcome.calls;
    started = outcome.calls == 1;
    if (!outcome.hasFailed) {
      EXPECT_EQ(outcome.succeeded, succeeds);
      EXPECT_FALSE(outcome.ranOutOfMemory);
      EXPECT_GT(allocations, 10);
      return;
    }
    EXPECT_EQ(outcome.ranOutOfMemory, started);
  }
}

class SendRequestAsync : public testing::TestWithParam<Shortage> {};

TEST_P(SendRequestAsync, CallsItsCompletionOnceWhereverMemoryRunsOut) {
  ExpectOneCallWhereverMemoryRunsOut(GetParam(), ANSWER, nullptr, true);
}

TEST_P(SendRequestAsync, CallsItsCompletionOnceWhereverMemoryRunsOutWithARefusedStatus) {
  ExpectOneCallWhereverMemoryRunsOut(GetParam(), REFUSAL, nullptr, false);
}

TEST_P(SendRequestAsync, CallsItsCompletionOnceWhereverMemoryRunsOutWithABadResponse) {
  ExpectOneCallWhereverMemoryRunsOut(GetParam(), "220 mail.example ESMTP\r\n", nullptr, false);
}

TEST_P(SendRequestAsync, CallsItsCompletionOnceWhereverMemoryRunsOutWithAFailedConnect) {
  const Tarvel::System::NetworkException failure("a text that is too long for the string itself, by some characters");
  ExpectOneCallWhereverMemoryRunsOut(GetParam(), ANSWER, &failure, false);
}

INSTANTIATE_TEST_SUITE_P(Failures, SendRequestAsync, testing::Values(Shortage::ONCE, Shortage::FROM_THEN),
                         [](const auto &shortage) {
                           return shortage.param == Shortage::ONCE ? "One" : "AllThatFollow";
                         });

} // namespace
} // namespace SsoClient
