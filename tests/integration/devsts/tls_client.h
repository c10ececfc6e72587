// SPDX-License-Identifier: Apache-2.0
/// @file
/// A blocking HTTPS client that uses only OpenSSL, so that a test can send exactly the bytes that it wants.

#pragma once

#include "support/dev_sts.h"

#include <memory>
#include <string>
#include <string_view>

struct ssl_st;
struct ssl_ctx_st;

namespace DevStsTest {

struct HttpAnswer {
  int status = 0; ///< 0 without a complete header
  std::string head;
  std::string body;
};

/// A connection to the service without TLS.
class RawConnection {
public:
  explicit RawConnection(const Testing::DevSts &service, bool v6 = false);
  RawConnection(const RawConnection &) = delete;
  RawConnection &operator=(const RawConnection &) = delete;
  ~RawConnection();

  void Send(std::string_view bytes);

  /// Waits until the service ends the connection, and discards what it sends before. Returns false after half a minute
  /// of silence.
  bool IsEnded();

  int GetDescriptor() const noexcept { return m_descriptor; }

private:
  int m_descriptor;
};

/// One connection to the service, which must present a certificate of its authority.
class TlsClient {
public:
  explicit TlsClient(const Testing::DevSts &service, bool v6 = false);
  /// Has the certificate and the key of this identity in the service's state folder, for a service that asks for one.
  TlsClient(const Testing::DevSts &service, const std::string &identity);
  TlsClient(const TlsClient &) = delete;
  TlsClient &operator=(const TlsClient &) = delete;

  void Send(std::string_view bytes);

  /// The next answer. Its body is as long as the Content-Length, or shorter when the service has ended the connection.
  HttpAnswer Receive();

  /// Whether the service has ended the connection. Waits until it does so or sends something.
  bool IsClosed();

private:
  bool ReadSome();
  void Connect();

  std::unique_ptr<ssl_ctx_st, void (*)(ssl_ctx_st *)> m_context;
  RawConnection m_connection;
  std::unique_ptr<ssl_st, void (*)(ssl_st *)> m_tls;
  std::string m_ahead;
};

/// The bytes of a SOAP request over HTTP. With an empty content type, the header Content-Type is missing.
std::string PostBytes(std::string_view action, std::string_view message, std::string_view target = "/sts",
                      std::string_view contentType = "text/xml");

/// Sends the request on a connection of its own.
HttpAnswer Post(const Testing::DevSts &service, std::string_view action, std::string_view message,
                std::string_view target = "/sts", std::string_view contentType = "text/xml");

} // namespace DevStsTest
