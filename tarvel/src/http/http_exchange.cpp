// SPDX-License-Identifier: Apache-2.0

#include "http/http_exchange.h"

#include "http/client_response_impl.h"
#include "http/current_failure.h"
#include "service/uncaught_exception.h"

#include <tarvel/core/secure_wipe.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <mutex>
#include <utility>

namespace Tarvel::Http {

namespace {

constexpr std::chrono::microseconds MAX_TIMEOUT = std::chrono::hours(24 * 365); // so that no addition overflows

/// "4 seconds", "0.25 seconds".
std::string DescribeSeconds(std::chrono::microseconds time) {
  constexpr std::int64_t MICROSECONDS = 1000000;
  std::string text = std::to_string(time.count() / MICROSECONDS);
  const std::int64_t rest = time.count() % MICROSECONDS;
  if (rest > 0) {
    const std::string digits = std::to_string(MICROSECONDS + rest).substr(1);
    text.append(".").append(digits, 0, digits.find_last_not_of('0') + 1);
  }
  return text + " seconds";
}

/// The Host header (RFC 9110, section 7.2): an IPv6 address in brackets, and the port unless it is the scheme's own.
std::string MakeHostHeader(const ConnectionSpec &spec, bool isSecure) {
  std::string host = spec.GetHost();
  if (host.find(':') != std::string::npos && host.front() != '[') {
    host = "[" + host + "]";
  }
  const std::string endpoint = spec.GetEndpointString();
  const std::size_t colon = endpoint.rfind(':');
  const std::string port = colon == std::string::npos ? "" : endpoint.substr(colon + 1);
  if (!port.empty() && port != (isSecure ? "443" : "80")) {
    host += ":" + port;
  }
  if (host.empty() || !IsFieldValue(host)) {
    throw InvalidArgumentException("the host of a connection is not allowed in an HTTP header.");
  }
  return host;
}

} // namespace

HttpExchange::HttpExchange(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies, RequestData request,
                           UserAgent::CompletionFunction completion)
    : m_endpoint(StringUtil::Shorten(spec->GetEndpointString())), m_request(std::move(request)),
      m_reader(m_request.method == "HEAD"), m_spec(spec), m_cookies(cookies), m_completion(std::move(completion)) {
  OutOfMemory(); // makes the exception while there is memory
}

HttpExchange::~HttpExchange() {
  SecureWipe(m_buffer.get(), m_bufferLength);
}

void HttpExchange::Start() {
  const Ref self(this);
  const Ref<ConnectionSpec> spec = m_spec; // the request may be done before `AsyncConnect` returns
  Ref<System::ScheduledItem> connecting;
  try {
    connecting = spec->AsyncConnect(
        [self](const Ref<System::Stream> &stream, const Exception *failure) { self->OnConnected(stream, failure); });
  } catch (...) {
    if (Abandon()) {
      throw;
    }
    return; // the specification called back before it threw, and that call decides the outcome
  }
  bool isCancelled = false;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_isConnectOver) {
      return;
    }
    m_connecting = connecting;
    isCancelled = m_isCancelled;
  }
  if (isCancelled && connecting) {
    connecting->Cancel();
  }
}

/// Ends the exchange without calling the completion function, if its connect has not ended. @return whether it did.
bool HttpExchange::Abandon() noexcept {
  UserAgent::CompletionFunction completion; // destroyed outside the lock
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_isConnectOver) {
    return false;
  }
  m_isConnectOver = m_isFinishing = true;
  completion.swap(m_completion);
  return true;
}

void HttpExchange::OnConnected(const Ref<System::Stream> &stream, const Exception *failure) {
  bool isCancelled = false;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (std::exchange(m_isConnectOver, true)) {
      return;
    }
    m_connecting.reset();
    m_stream = stream;
    isCancelled = m_isCancelled;
  }
  if (isCancelled) {
    Finish(nullptr, nullptr);
    return;
  }
  RunGuarded([&] {
    if (failure) {
      failure->Throw();
    }
    if (!stream) {
      throw InvalidStateException("A connection specification reported neither a stream nor a failure");
    }
    ReplaceBuffer(FIRST_BUFFER_BYTES);
    Send(stream);
    // Reads at once, because a server that refuses a request may answer and close before it has read the request.
    Read(stream);
  });
}

void HttpExchange::Send(const Ref<System::Stream> &stream) {
  m_isSecure = stream->IsSecure();
  m_message = Serialise(m_request, MakeHostHeader(*m_spec, m_isSecure),
                        m_cookies->GetHeader(m_spec->GetHost(), m_request.target, m_isSecure));
  m_request.body = SecretText();
  const std::string &message = m_message.Get();
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    m_hasConnected = true; // even if the write fails: it may have sent a part
  }
  stream->AsyncWrite(message.data(), message.size(), [self = Ref(this)](std::size_t, const Exception *failure) {
    self->RunGuarded([&self, failure] { self->OnWritten(failure); });
  });
}

/// A write that fails does not end the exchange: the read fails too, and its error is more specific.
void HttpExchange::OnWritten(const Exception *failure) {
  m_message = SecretText();
  std::shared_ptr<const Exception> writeFailure(failure ? failure->Clone() : nullptr);
  bool endWaits = false;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    m_isWriteOver = true;
    m_writeFailure = std::move(writeFailure);
    endWaits = m_endWaitsForWrite;
  }
  if (endWaits) {
    FinishEnd();
  }
}

void HttpExchange::ReplaceBuffer(std::size_t length) {
  auto buffer = std::make_unique_for_overwrite<char[]>(length);
  SecureWipe(m_buffer.get(), m_bufferLength);
  m_buffer = std::move(buffer);
  m_bufferLength = length;
}

void HttpExchange::Read(const Ref<System::Stream> &stream) {
  stream->AsyncReadSome(m_buffer.get(), m_bufferLength,
                        [self = Ref(this)](std::size_t count, const Exception *failure) {
                          self->RunGuarded([&self, count, failure] { self->OnRead(count, failure); });
                        });
}

void HttpExchange::OnRead(std::size_t count, const Exception *failure) {
  if (failure) {
    failure->Throw();
  }
  if (count == 0) {
    OnEnd();
    return;
  }
  ParseWithContext([this, count] { m_reader.Put({m_buffer.get(), count}); });
  if (m_reader.IsComplete()) {
    FinishResponse();
    return;
  }
  if (m_bufferLength < BUFFER_BYTES) {
    ReplaceBuffer(BUFFER_BYTES);
  }
  Ref<System::Stream> stream;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    stream = m_stream;
  }
  if (stream) {
    Read(stream);
  }
}

/// The kernel reports a reset only once. If the write got that report, the read sees an orderly end. So an end of the
/// connection that delimits the body is accepted only if the write succeeded.
void HttpExchange::OnEnd() {
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (!m_isWriteOver && m_reader.EndsWithConnection()) {
      m_endWaitsForWrite = true;
      return;
    }
  }
  FinishEnd();
}

void HttpExchange::FinishEnd() {
  std::shared_ptr<const Exception> writeFailure;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    writeFailure = m_writeFailure;
  }
  if (writeFailure) {
    writeFailure->Throw();
  }
  ParseWithContext([this] { m_reader.PutEnd(); });
  FinishResponse();
}

void HttpExchange::FinishResponse() {
  ResponseData response = m_reader.Take();
  KeepCookies(response);
  Finish(nullptr, MakeRef<ClientResponseImpl>(std::move(response)));
}

void HttpExchange::KeepCookies(const ResponseData &response) {
  Ref<ConnectionSpec> spec;
  Ref<CookieStore> cookies;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_isFinishing) {
      return; // another step has failed, and has released them
    }
    spec = m_spec;
    cookies = m_cookies;
  }
  for (const auto &[name, value] : response.fields) {
    if (EqualsIgnoringCase(name, "Set-Cookie")) {
      cookies->SetFromHeader(value, spec->GetHost(), m_request.target, m_isSecure);
    }
  }
}

void HttpExchange::ParseWithContext(const std::function<void()> &call) const {
  try {
    call();
  } catch (const HttpException &exception) {
    throw HttpException("Bad response from " + m_endpoint + ": " + exception.what());
  }
}

template <typename Call>
void HttpExchange::RunGuarded(const Call &step) noexcept {
  try {
    step();
  } catch (...) {
    Finish(CurrentFailure(m_endpoint), nullptr);
  }
}

std::shared_ptr<const Exception> HttpExchange::Cancelled(std::chrono::microseconds exceededTimeout) const noexcept {
  try {
    if (exceededTimeout.count() > 0) {
      ThrowTimeout(exceededTimeout);
    }
    throw System::NetworkException("The request to " + m_endpoint + " was cancelled");
  } catch (...) {
    return CurrentFailure(m_endpoint);
  }
}

/// If both `failure` and `response` are null, the request was cancelled.
void HttpExchange::Finish(std::shared_ptr<const Exception> failure, const Ref<ClientResponse> &response) noexcept {
  Ref<System::Stream> stream;
  Ref<ConnectionSpec> spec;
  Ref<CookieStore> cookies;
  UserAgent::CompletionFunction completion;
  bool isCancelled = false;
  std::chrono::microseconds exceededTimeout{0};
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (std::exchange(m_isFinishing, true)) {
      return;
    }
    stream = std::move(m_stream);
    spec = std::move(m_spec);
    cookies = std::move(m_cookies);
    completion = std::exchange(m_completion, nullptr);
    isCancelled = m_isCancelled && !response;
    exceededTimeout = m_exceededTimeout;
  }
  if (isCancelled) {
    failure = Cancelled(exceededTimeout);
  }
  if (stream) {
    stream->Close();
  }
  // Before the host learns of the end, so that its objects are not destroyed on this thread after that.
  stream.reset();
  spec.reset();
  cookies.reset();
  Complete(completion, failure.get(), response);
  completion = nullptr; // releases what it captures before the waiting threads continue
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    m_failure = failure;
    m_response = response;
    m_isDone = true;
  }
  m_done.notify_all();
}

void HttpExchange::Complete(const UserAgent::CompletionFunction &completion, const Exception *failure,
                            const Ref<ClientResponse> &response) noexcept {
  if (!completion) {
    return;
  }
  try {
    completion(failure, response, Ref<PendingRequestItem>(this));
  } catch (...) {
    Service::LogUncaughtException("the completion function of an HTTP request");
  }
}

Ref<ClientResponse> HttpExchange::Wait(std::chrono::microseconds timeout) {
  timeout = std::clamp(timeout, std::chrono::microseconds(0), MAX_TIMEOUT);
  const auto deadline = std::chrono::steady_clock::now() + timeout;
  std::unique_lock<ForkSafeMutex> lock(m_mutex);
  if (!m_isDone && IsOfParent()) {
    throw System::NetworkException("The request to " + m_endpoint +
                                   " was under way when the process forked: its parent goes on with it");
  }
  if (!m_done.wait_until(lock, deadline, [this] { return m_isDone; })) {
    lock.unlock();
    Cancel();
    ThrowTimeout(timeout);
  }
  if (m_failure) {
    m_failure->Throw();
  }
  return m_response;
}

void HttpExchange::ThrowTimeout(std::chrono::microseconds timeout) const {
  throw System::TimeoutException("No response from " + m_endpoint + " within " + DescribeSeconds(timeout));
}

void HttpExchange::TimeOut(std::int64_t timeoutMicroseconds) noexcept {
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_isFinishing || m_isCancelled) {
      return;
    }
    m_exceededTimeout = std::max(std::chrono::microseconds(timeoutMicroseconds), std::chrono::microseconds(1));
  }
  Cancel();
}

void HttpExchange::Cancel() noexcept {
  Ref<System::ScheduledItem> connecting;
  Ref<System::Stream> stream;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_isFinishing || IsOfParent()) {
      return;
    }
    m_isCancelled = true;
    connecting = m_connecting;
    stream = m_stream;
  }
  if (connecting) {
    connecting->Cancel();
  }
  if (stream) {
    stream->Close();
  }
}

bool HttpExchange::HasConnected() const noexcept {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  return m_hasConnected;
}

bool HttpExchange::IsDone() const noexcept {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  return m_isDone || IsOfParent();
}

} // namespace Tarvel::Http
