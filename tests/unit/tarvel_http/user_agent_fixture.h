// SPDX-License-Identifier: Apache-2.0
/// @file
/// The fixture of the user agent's tests, with a stream and a connection specification that a test controls.

#pragma once

#include "system/io_engine.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/user_agent.h>

#include <boost/asio/post.hpp>
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <mutex>
#include <string>
#include <utility>

namespace Tarvel::Http {

constexpr std::int64_t LONG = 60 * 1000000; // microseconds

/// Answers at the first read. A write never ends before the stream is closed.
class AnsweringStream : public System::Stream {
public:
  explicit AnsweringStream(std::string answer) : m_answer(std::move(answer)) {}

  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override {
    const std::size_t count = m_answer.copy(buffer, length);
    m_answer.erase(0, count);
    boost::asio::post(System::GetIoContext(), [handler, count] { handler(count, nullptr); });
  }

  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_written.assign(bytes, length);
    ++m_writes;
    m_write = std::move(handler);
  }

  /// The bytes of the last write.
  std::string GetWritten() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_written;
  }

  int GetWriteCount() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_writes;
  }

  void Close() noexcept override {
    TransferHandler write;
    {
      const std::lock_guard<std::mutex> lock(m_mutex);
      write = std::exchange(m_write, nullptr);
    }
    if (write) {
      boost::asio::post(System::GetIoContext(), [write] {
        const System::NetworkException closed("closed");
        write(0, &closed);
      });
    }
  }

private:
  std::mutex m_mutex;
  std::string m_answer;
  TransferHandler m_write;
  std::string m_written;
  int m_writes = 0;
};

/// Connects to one stream, or throws when that is null.
class OneStreamSpec : public CustomConnectionSpec {
public:
  explicit OneStreamSpec(const Ref<System::Stream> &stream) : m_stream(stream) {}

  std::string ToString() const override { return "one stream"; }
  std::string GetHost() const override { return "sts.example"; }
  std::string GetEndpointString() const override { return "sts.example:80"; }
  bool IsReuseOnAuthErrorSupported() const override { return false; }
  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    if (!m_stream) {
      throw InvalidStateException("nothing to connect to");
    }
    boost::asio::post(System::GetIoContext(), [completion, stream = m_stream] { completion(stream, nullptr); });
    return System::CreateStreamCanceller(m_stream);
  }

private:
  const Ref<System::Stream> m_stream;
};

class UserAgentTest : public testing::Test {
protected:
  Ref<UserAgent> Create(const Ref<System::Stream> &stream) {
    return CreateHttpUserAgent(MakeRef<OneStreamSpec>(stream), m_cookies);
  }

  static Ref<ClientRequest> Post() {
    Ref<ClientRequest> request = CreateHttpRequest("POST", "/");
    request->WriteBody("body");
    return request;
  }

  /// What the user agent writes to `stream` for a request.
  std::string Send(const Ref<AnsweringStream> &stream) {
    const Ref<UserAgent> agent = Create(stream);
    agent->StartRequest(Post(), nullptr, m_pending);
    agent->WaitForRequest(m_pending, LONG, m_response);
    return stream->GetWritten();
  }

  const Ref<CookieStore> m_cookies = CreateCookieStore();
  Ref<PendingRequestItem> m_pending;
  Ref<ClientResponse> m_response;
};

} // namespace Tarvel::Http
