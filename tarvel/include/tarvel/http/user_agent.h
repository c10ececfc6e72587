// SPDX-License-Identifier: Apache-2.0
/// @file
/// The HTTP/1.1 client.

#pragma once

#include <tarvel/core/exception.h>
#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/http/cookie_store.h>
#include <tarvel/io/reader.h>
#include <tarvel/system/scheduled_item.h>

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

namespace Tarvel::Http {

constexpr std::size_t MAX_HEADER_BYTES = 64u * 1024;      ///< of each response, interim ones too; status line included
constexpr std::size_t MAX_BODY_BYTES = 16u * 1024 * 1024; ///< of a response

/// A response that is not HTTP/1.x by RFC 9112, contradicts itself, ends early or exceeds a limit.
class TARVEL_API HttpException : public Exception {
  TARVEL_EXCEPTION_BODY(HttpException, Exception);
};

/// A request, which can be sent once. Used by one thread at a time. Its body is wiped when the request is destroyed.
class TARVEL_API ClientRequest : public Object {
public:
  /// Sets a header; an earlier one of the same name is replaced.
  /// @throws InvalidArgumentException when name or value is not allowed in a header (line ends, control characters), or
  ///         the user agent itself sets that header: Host, Connection, Content-Length, Transfer-Encoding, Expect, Cookie
  ///         and Accept-Encoding.
  virtual void SetHeader(std::string_view name, std::string_view value) = 0;
  /// Appends to the body.
  virtual void WriteBody(std::string_view bytes) = 0;

protected:
  ~ClientRequest() override;
};

/// A whole response. It is a reader of the body, which is wiped when the response is destroyed; the caller wipes what
/// `ReadToEnd` returns. With a status other than 2xx and 500, only the header was read: the body is empty, and if a
/// header states the body's length or coding in a wrong way, that header and the ones after it are missing.
///
/// The body is returned as it was received, with one exception: a body that the charset of its media type declares as
/// ISO-8859-1, under any of the names that IANA lists, is returned as UTF-8, unless it already is valid UTF-8 with
/// characters beyond ASCII. If its XML declaration says ISO-8859-1, that is changed to UTF-8. Such a body is at most
/// twice as long as the received one.
class TARVEL_API ClientResponse : public Reader {
public:
  /// The status code of the status line, for example 200.
  virtual int GetStatusCode() const noexcept = 0;
  /// The text after the status code; may be empty.
  virtual const std::string &GetReasonPhrase() const noexcept = 0;
  /// The value of a header, the first of that name in any letter case; false when there is none.
  virtual bool GetHeader(std::string_view name, std::string &value) const = 0;
  /// The number of octets of the body as it was received, without those of the transfer coding.
  virtual std::size_t GetBodyLength() const noexcept = 0;

protected:
  ~ClientResponse() override;
};

/// A request that has been started.
class TARVEL_API PendingRequestItem : public System::ScheduledItem {
public:
  /// Whether the server may have received a part of the request. False means that nothing was sent: no connection was
  /// made (over TLS: or the handshake failed), or the request was cancelled before that. The value is final when the
  /// completion function is called. In a child process, it is the value at the time of the fork.
  virtual bool HasConnected() const noexcept = 0;

  /// Cancels the request. Its completion function receives the exception that `WaitForRequest` throws after a time-out
  /// of `timeoutMicroseconds`.
  virtual void TimeOut(std::int64_t timeoutMicroseconds) noexcept = 0;

protected:
  ~PendingRequestItem() override;
};

/// Connections kept for later requests. There are no pools yet: a user agent is created with a null pool and opens one
/// connection for each request.
class TARVEL_API ConnectionPool : public Object {
protected:
  ~ConnectionPool() override;
};

/// Sends requests over connections of one specification, with the cookies of one store. A connection is secure (for the
/// Host header's port, and for cookies that are only for secure connections) when its stream reports that
/// (`Stream::IsSecure`). Safe on any thread.
class TARVEL_API UserAgent : public Object {
public:
  /// Called exactly once for each start, on an I/O thread: with null and the whole response, or with an exception and
  /// null. When memory runs out, the exception is an `OutOfMemoryException`. When another library, a stream, a
  /// connection specification or a cookie store throws something that is not a `Tarvel::Exception`, the exception is an
  /// `InvalidStateException` with the text of what was thrown. It is valid only during the call. The item is the one
  /// that `StartRequest` returns. An exception that the function throws is logged and has no other effect. The
  /// function must not block, nor wait for another request: there are only two I/O threads, and that request completes
  /// on one of them. Start the next request from here, and queue work that takes time on a thread pool. The function is
  /// never called in a child that `fork` has made after the start.
  using CompletionFunction =
      std::function<void(const Exception *, const Ref<ClientResponse> &, const Ref<PendingRequestItem> &)>;

  /// Connects, sends and reads the response, without blocking. There is no time-out: a caller that does not call
  /// `WaitForRequest` must cancel the item itself when the request takes too long. Redirects are not followed. At most
  /// 16 interim responses (1xx except 101) are skipped; one more is an HttpException. A status other than 2xx and 500 is
  /// reported as soon as its header has arrived. Content is not decoded: the request accepts no coding, and a 2xx or
  /// 500 response whose content has one is a failure. Bytes after the response are ignored. The request's body is wiped
  /// after it is sent. The request releases the connection specification, the cookie store and the stream before its
  /// completion function is called. A stream of the platform exists until its last operation has ended, too.
  /// @throws InvalidArgumentException for a request that `CreateHttpRequest` did not make, InvalidStateException for one
  ///         that has been started, and any exception of the connection specification. In these cases the completion
  ///         function is not called.
  virtual void StartRequest(const Ref<ClientRequest> &request, CompletionFunction completion,
                            Ref<PendingRequestItem> &pending) = 0;

  /// Waits until the request is done and its completion function has returned. Do not call it in a completion function,
  /// which would wait for itself.
  /// @param timeoutMicroseconds counted from this call; when it has passed, the request is cancelled.
  /// @throws System::TimeoutException after the time-out; System::NetworkException, at once, in a child that `fork` made
  ///         while the request was under way; otherwise the exception with which the request failed, in its own class;
  ///         InvalidArgumentException for an item that is not a request.
  virtual void WaitForRequest(const Ref<PendingRequestItem> &pending, std::int64_t timeoutMicroseconds,
                              Ref<ClientResponse> &response) = 0;

protected:
  ~UserAgent() override;
};

/// Makes a user agent, which keeps a reference to `spec` and to `cookies`. May be called on any thread.
/// @param pool must be null.
/// @param out the user agent; unchanged when an exception is thrown.
/// @throws InvalidArgumentException when `pool` is not null, or one of the others is null.
TARVEL_API void CreateHttpUserAgent(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies,
                                    const Ref<ConnectionPool> &pool, Ref<UserAgent> &out);

/// Returns the user agent that the function above makes without a connection pool.
/// @throws InvalidArgumentException when `spec` or `cookies` is null.
inline Ref<UserAgent> CreateHttpUserAgent(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies) {
  Ref<UserAgent> userAgent;
  CreateHttpUserAgent(spec, cookies, nullptr, userAgent);
  return userAgent;
}

/// Makes a request without headers and body. May be called on any thread.
/// @param method for example "POST". @param path path and query, beginning with "/".
/// @param out the request; unchanged when an exception is thrown.
/// @throws InvalidArgumentException when `method` or `path` is not allowed in a request line.
TARVEL_API void CreateHttpRequest(std::string_view method, std::string_view path, Ref<ClientRequest> &out);

/// Returns the request that the function above makes. @throws InvalidArgumentException as above.
inline Ref<ClientRequest> CreateHttpRequest(std::string_view method, std::string_view path) {
  Ref<ClientRequest> request;
  CreateHttpRequest(method, path, request);
  return request;
}

} // namespace Tarvel::Http
