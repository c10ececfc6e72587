// SPDX-License-Identifier: Apache-2.0
/// @file
/// One request and its response, over one connection.

#pragma once

#include "core/fork_gate.h"
#include "http/client_request_impl.h"
#include "http/response_reader.h"

#include <tarvel/core/secret_text.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/http/cookie_store.h>
#include <tarvel/http/user_agent.h>

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <functional>
#include <memory>
#include <string>

namespace Tarvel::Http {

/// Connects, sends and reads on the I/O threads; the end of each step starts the next. Pending handlers keep the
/// exchange alive.
class HttpExchange final : public PendingRequestItem {
public:
  HttpExchange(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies, RequestData request,
               UserAgent::CompletionFunction completion);

  /// Must be called once. If it throws, the completion function has not been called and never will be.
  void Start();

  /// Blocks only the calling thread, until the completion function has run.
  /// @throws System::TimeoutException after the time-out, which cancels the request; System::NetworkException at once
  ///         in a child of the process that started the request, unless the request was done before; otherwise the
  ///         exception that the request failed with.
  Ref<ClientResponse> Wait(std::chrono::microseconds timeout);

  /// Does nothing in a child of the process that started the request: there the request counts as done.
  void Cancel() noexcept override;
  bool IsDone() const noexcept override;
  bool HasConnected() const noexcept override;
  void TimeOut(std::int64_t timeoutMicroseconds) noexcept override;

private:
  /// Many requests may wait for their responses, so the first buffer is small. If the first read does not complete the
  /// response, further reads use a large one.
  static constexpr std::size_t FIRST_BUFFER_BYTES = 8 * 1024;
  static constexpr std::size_t BUFFER_BYTES = 16 * 1024; // the content of one TLS record

  ~HttpExchange() override;

  void OnConnected(const Ref<System::Stream> &stream, const Exception *failure);
  void OnWritten(const Exception *failure);
  void OnRead(std::size_t count, const Exception *failure);
  void OnEnd();

  void Send(const Ref<System::Stream> &stream);
  void ReplaceBuffer(std::size_t length);
  void Read(const Ref<System::Stream> &stream);
  void FinishEnd();
  void FinishResponse();
  void KeepCookies(const ResponseData &response);

  /// Runs `call`, which calls the reader, and adds the endpoint to the message of the reader's exception.
  void ParseWithContext(const std::function<void()> &call) const;
  /// Runs one step; an exception ends the exchange with that failure.
  template <typename Call>
  void RunGuarded(const Call &step) noexcept;
  /// The failure of a request that was cancelled.
  std::shared_ptr<const Exception> Cancelled(std::chrono::microseconds exceededTimeout) const noexcept;
  [[noreturn]] void ThrowTimeout(std::chrono::microseconds timeout) const;
  void Finish(std::shared_ptr<const Exception> failure, const Ref<ClientResponse> &response) noexcept;
  bool Abandon() noexcept;
  void Complete(const UserAgent::CompletionFunction &completion, const Exception *failure,
                const Ref<ClientResponse> &response) noexcept;

  /// Whether this is a child's copy of its parent's exchange, which never ends here.
  bool IsOfParent() const noexcept { return m_generation != GetForkGeneration(); }

  const unsigned m_generation = GetForkGeneration();
  const std::string m_endpoint; // for messages

  // Only one step at a time uses each of these members, so they need no lock. The message is kept until it is written.
  RequestData m_request;
  SecretText m_message;
  // Contains parts of the response, which may be secret.
  std::unique_ptr<char[]> m_buffer; // NOLINT(modernize-avoid-c-arrays): with its length beside it
  std::size_t m_bufferLength = 0;
  ResponseReader m_reader;
  bool m_isSecure = false;

  mutable ForkSafeMutex m_mutex; // guards all members below; never held while a handler or a completion function runs
  std::condition_variable_any m_done;
  // Null when the outcome is decided. The steps up to the write need no lock for them, because only later ones decide.
  Ref<ConnectionSpec> m_spec;
  Ref<CookieStore> m_cookies;
  Ref<System::ScheduledItem> m_connecting;
  Ref<System::Stream> m_stream;
  UserAgent::CompletionFunction m_completion;
  bool m_isConnectOver = false;
  bool m_hasConnected = false;
  bool m_isCancelled = false;
  std::chrono::microseconds m_exceededTimeout{0}; // 0 unless the request was cancelled because it took too long
  bool m_isWriteOver = false;
  bool m_endWaitsForWrite = false;
  std::shared_ptr<const Exception> m_writeFailure;
  bool m_isFinishing = false; // the outcome is decided; the completion function may be running
  bool m_isDone = false;
  std::shared_ptr<const Exception> m_failure;
  Ref<ClientResponse> m_response;
};

} // namespace Tarvel::Http
