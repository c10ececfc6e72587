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

/// A response that is not HTTP/1.x as RFC 9112 has it, that contradicts itself, ends early or is over a limit.
class TARVEL_API HttpException : public Exception {
  TARVEL_EXCEPTION_BODY(HttpException, Exception);
};

/// A request to be sent. For one thread, and for one start. Its body is wiped when it is destroyed.
class TARVEL_API ClientRequest : public Object {
public:
  /// Sets a header, in place of an earlier one of the same name.
  /// @throws InvalidArgumentException when name or value may not stand in a header (line ends, control characters), or
  ///         the user agent itself sets that header: Host, Connection, Content-Length, Transfer-Encoding, Expect, Cookie
  ///         and Accept-Encoding.
  virtual void SetHeader(std::string_view name, std::string_view value) = 0;
  /// Appends to the body.
  virtual void WriteBody(std::string_view bytes) = 0;

protected:
  ~ClientRequest() override;
};

/// A whole response. As a reader it gives the body, which is wiped when the response is destroyed; what `ReadToEnd` hands
/// out is the caller's to wipe. With a status other than 2xx and 500, the header is all that was read:
/// the body is empty, and when the header states the body's length or coding in a wrong way, the headers from that one on
/// are missing.
///
/// A body is handed on as it came, with one exception: one that is declared as ISO-8859-1 by the charset of its media type,
/// under any of the names that IANA lists, is handed on as UTF-8, unless it is UTF-8 and not ASCII already. An XML
/// declaration in it that names ISO-8859-1 then names UTF-8. Such a body has at most twice the bytes of the one that came.
class TARVEL_API ClientResponse : public Reader {
public:
  virtual int GetStatusCode() const noexcept = 0;
  virtual const std::string &GetReasonPhrase() const noexcept = 0;
  /// The value of a header, the first of that name in any letter case; false when there is none.
  virtual bool GetHeader(std::string_view name, std::string &value) const = 0;

protected:
  ~ClientResponse() override;
};

/// A request that has been started.
class TARVEL_API PendingRequestItem : public System::ScheduledItem {
protected:
  ~PendingRequestItem() override;
};

/// Connections kept for later requests. None is offered yet: a user agent is created with a null pool and opens one
/// connection for each request.
class TARVEL_API ConnectionPool : public Object {
protected:
  ~ConnectionPool() override;
};

/// Sends requests over connections of one specification, with the cookies of one store. A connection counts as secure
/// (for the Host header's port, and for cookies that are for secure connections only) when its stream is an
/// `Ssl::SSLStream`. Safe on any thread.
class TARVEL_API UserAgent : public Object {
public:
  /// Called exactly once for each start, on an I/O thread: with null and the whole response, or with an exception and
  /// null, whatever went wrong: memory that ran out is an `OutOfMemoryException`, what another library or an
  /// implementation of stream, specification or cookie store throws that is not a `Tarvel::Exception` is an
  /// `InvalidStateException` with its text. The exception is valid during the call. The item is the one that
  /// `StartRequest` hands out. An exception that leaves the function is logged and goes no further. The function must not
  /// block, nor wait for another request: the thread is one of two, on which that request would have to complete. Start
  /// the next one from here, and queue work that takes time on a thread pool. It is never called in a child that `fork` has
  /// made since the start.
  using CompletionFunction =
      std::function<void(const Exception *, const Ref<ClientResponse> &, const Ref<PendingRequestItem> &)>;

  /// Connects, sends and reads the response, without blocking, and without a time-out of its own: who does not wait may
  /// cancel the item. Redirects are not followed. At most 16 interim responses (1xx but 101) are passed over; one more is
  /// an HttpException. A status other than 2xx and 500 is reported as soon as its header is there. With 2xx and 500,
  /// content is not decoded; as no coding is asked for, content that has one is a failure. Bytes after the response are
  /// ignored. The request's body is wiped once it is sent.
  /// @throws InvalidArgumentException for a request that `CreateHttpRequest` did not make, InvalidStateException for one
  ///         that has been started, and whatever the connection specification throws; the completion function is not
  ///         called then.
  virtual void StartRequest(const Ref<ClientRequest> &request, CompletionFunction completion,
                            Ref<PendingRequestItem> &pending) = 0;

  /// Waits until the request is done and its completion function has run. Not for use in a completion function, which
  /// would wait for itself.
  /// @param timeoutMicroseconds counted from this call; when it has passed, the request is cancelled.
  /// @throws System::TimeoutException after the time-out; System::NetworkException, at once, in a child that `fork` made
  ///         while the request was under way; otherwise what the request failed with, as its own class;
  ///         InvalidArgumentException for an item that is not a request.
  virtual void WaitForRequest(const Ref<PendingRequestItem> &pending, std::int64_t timeoutMicroseconds,
                              Ref<ClientResponse> &response) = 0;

protected:
  ~UserAgent() override;
};

/// @param pool must be null. @throws InvalidArgumentException when it is not, or one of the others is null.
TARVEL_API void CreateHttpUserAgent(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies,
                                    const Ref<ConnectionPool> &pool, Ref<UserAgent> &out);

/// @param method as "POST". @param path path and query, beginning with "/".
/// @throws InvalidArgumentException when either may not stand in a request line.
TARVEL_API void CreateHttpRequest(std::string_view method, std::string_view path, Ref<ClientRequest> &out);

} // namespace Tarvel::Http
