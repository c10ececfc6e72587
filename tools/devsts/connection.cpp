// SPDX-License-Identifier: Apache-2.0

#include "connection.h"

#include "delivery.h"
#include "request_handler.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/core/tcp_stream.hpp>
#include <boost/beast/http/error.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/read.hpp>
#include <boost/beast/http/string_body.hpp>
#include <boost/beast/ssl/ssl_stream.hpp>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <sstream>
#include <string>
#include <string_view>
#include <utility>

namespace DevSts {

namespace {

namespace asio = boost::asio;
namespace beast = boost::beast;
namespace http = boost::beast::http;

constexpr std::chrono::seconds HANDSHAKE_LIMIT(30);
constexpr std::chrono::seconds REQUEST_LIMIT(60); // also closes an idle connection
constexpr std::chrono::seconds WRITE_LIMIT(60);
constexpr std::chrono::seconds CLOSE_LIMIT(5);
constexpr std::uint32_t HEADER_BYTES = 16 * 1024;
constexpr std::uint64_t BODY_BYTES = 1024 * 1024;

std::string Describe(const asio::ip::tcp::socket &socket) {
  beast::error_code error;
  const asio::ip::tcp::endpoint peer = socket.remote_endpoint(error);
  std::ostringstream text;
  text << peer;
  return text.str();
}

std::string Field(const http::request<http::string_body> &message, std::string_view name) {
  return std::string(message[boost::string_view(name.data(), name.size())]);
}

/// Lives as long as one of its operations is under way. Everything runs on the strand of its socket.
class Connection : public std::enable_shared_from_this<Connection> {
public:
  /// All references outlive the connection. `count` is one higher while it lives.
  Connection(asio::ip::tcp::socket socket, asio::ssl::context &tls, const RequestHandler &handler,
             std::atomic<int> &count);
  Connection(const Connection &) = delete;
  Connection &operator=(const Connection &) = delete;
  ~Connection();

  void Start();

private:
  using ErrorCode = beast::error_code;

  void Read();
  void OnRead(const ErrorCode &error);
  void RefuseUnreadable(const ErrorCode &error);
  void Begin(Delivery delivery);
  void NextStep();
  void WriteStep();
  void Finish();
  void Close();
  void Linger();
  void Reset();
  void AwaitPeer();
  HttpRequest TakeRequest();

  beast::ssl_stream<beast::tcp_stream> m_stream;
  asio::steady_timer m_timer;
  const RequestHandler &m_handler;
  std::atomic<int> &m_count;
  std::string m_peer;
  beast::flat_buffer m_buffer;
  std::optional<http::request_parser<http::string_body>> m_parser;
  Delivery m_delivery;
  std::size_t m_step = 0;
};

Connection::Connection(asio::ip::tcp::socket socket, asio::ssl::context &tls, const RequestHandler &handler,
                       std::atomic<int> &count)
    : m_stream(std::move(socket), tls), m_timer(m_stream.get_executor()), m_handler(handler), m_count(count),
      m_peer(Describe(m_stream.next_layer().socket())) {
  ++m_count;
  beast::error_code ignored;
  m_stream.next_layer().socket().set_option(asio::ip::tcp::no_delay(true), ignored);
}

Connection::~Connection() {
  --m_count;
}

void Connection::Start() {
  m_stream.next_layer().expires_after(HANDSHAKE_LIMIT);
  m_stream.async_handshake(asio::ssl::stream_base::server, [self = shared_from_this()](const ErrorCode &error) {
    if (error) {
      LogLine(self->m_peer + ": handshake failed: " + error.message());
      return;
    }
    self->Read();
  });
}

void Connection::Read() {
  m_parser.emplace();
  m_parser->header_limit(HEADER_BYTES);
  m_parser->body_limit(BODY_BYTES);
  m_stream.next_layer().expires_after(REQUEST_LIMIT);
  http::async_read(m_stream, m_buffer, *m_parser,
                   [self = shared_from_this()](const ErrorCode &error, std::size_t) { self->OnRead(error); });
}

void Connection::OnRead(const ErrorCode &error) {
  if (error == http::error::end_of_stream) {
    Close();
    return;
  }
  if (error) {
    RefuseUnreadable(error);
    return;
  }
  Begin(m_handler.Handle(TakeRequest()));
}

/// Answers a request that violates HTTP or exceeds a limit. A broken connection gets no answer.
void Connection::RefuseUnreadable(const ErrorCode &error) {
  if (error.category() != http::make_error_code(http::error::bad_value).category() ||
      error == http::error::partial_message) {
    return;
  }
  LogLine(m_peer + ": refused: " + error.message());
  const int status = error == http::error::body_limit ? 413 : error == http::error::header_limit ? 431 : 400;
  Begin(Deliver({status, "text/plain", error.message() + "\n"}, Fault(), false));
}

HttpRequest Connection::TakeRequest() {
  http::request<http::string_body> message = m_parser->release();
  HttpRequest request;
  request.peer = m_peer;
  request.method = std::string(message.method_string());
  request.target = std::string(message.target());
  request.contentType = Field(message, "Content-Type");
  request.soapAction = Field(message, "SOAPAction");
  request.keepOpen = message.keep_alive();
  request.body = std::move(message.body());
  request.peerCertificate.reset(SSL_get1_peer_certificate(m_stream.native_handle()));
  return request;
}

void Connection::Begin(Delivery delivery) {
  m_delivery = std::move(delivery);
  m_step = 0;
  NextStep();
}

void Connection::NextStep() {
  if (m_step == m_delivery.steps.size()) {
    Finish();
    return;
  }
  const std::chrono::milliseconds delay = m_delivery.steps[m_step].delay;
  if (delay.count() == 0) {
    WriteStep();
    return;
  }
  m_timer.expires_after(delay);
  m_timer.async_wait([self = shared_from_this()](const ErrorCode &error) {
    if (!error) {
      self->WriteStep();
    }
  });
}

void Connection::WriteStep() {
  m_stream.next_layer().expires_after(WRITE_LIMIT);
  asio::async_write(m_stream, asio::buffer(m_delivery.steps[m_step].bytes),
                    [self = shared_from_this()](const ErrorCode &error, std::size_t) {
                      if (error) {
                        return;
                      }
                      ++self->m_step;
                      self->NextStep();
                    });
}

void Connection::Finish() {
  switch (m_delivery.end) {
  case DeliveryEnd::KEEP_OPEN:
    Read();
    return;
  case DeliveryEnd::CLOSE:
    Close();
    return;
  case DeliveryEnd::RESET:
    Reset();
    return;
  case DeliveryEnd::STALL:
    AwaitPeer();
    return;
  }
}

void Connection::Close() {
  m_stream.next_layer().expires_after(CLOSE_LIMIT);
  m_stream.async_shutdown([self = shared_from_this()](const ErrorCode &) { self->Linger(); });
}

/// A socket that is closed while bytes are unread sends a reset, which destroys the answer on its way to a client that
/// is still sending. So this reads on until the client closes the connection or the time limit is reached.
void Connection::Linger() {
  ErrorCode ignored;
  m_stream.next_layer().socket().shutdown(asio::ip::tcp::socket::shutdown_send, ignored);
  m_buffer.clear();
  m_stream.next_layer().async_read_some(m_buffer.prepare(64 * 1024),
                                        [self = shared_from_this()](const ErrorCode &error, std::size_t) {
                                          if (!error) {
                                            self->Linger();
                                          }
                                        });
}

void Connection::Reset() {
  ErrorCode ignored;
  asio::ip::tcp::socket &socket = m_stream.next_layer().socket();
  socket.set_option(asio::socket_base::linger(true, 0), ignored); // closing now sends a reset
  socket.close(ignored);
}

/// Never answers; ends when the client closes the connection.
void Connection::AwaitPeer() {
  m_stream.next_layer().expires_never();
  m_buffer.clear();
  m_stream.async_read_some(m_buffer.prepare(4096), [self = shared_from_this()](const ErrorCode &error, std::size_t) {
    if (!error) {
      self->AwaitPeer();
    }
  });
}

} // namespace

void StartConnection(asio::ip::tcp::socket socket, asio::ssl::context &tls, const RequestHandler &handler,
                     std::atomic<int> &count) {
  std::make_shared<Connection>(std::move(socket), tls, handler, count)->Start();
}

} // namespace DevSts
