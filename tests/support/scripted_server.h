// SPDX-License-Identifier: Apache-2.0
/// @file
/// A TCP or TLS server on loopback inside the test process. A script controls each connection. The server uses only
/// sockets and OpenSSL, so that it shares no code with the library that it tests.

#pragma once

#include "support/loopback_socket.h"
#include "support/unavailable_port.h"

#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

struct ssl_st;
struct ssl_ctx_st;

namespace Testing {

/// How a server speaks TLS. The certificate is one of tests/data/tls, by name.
struct TlsSettings {
  std::string certificate = "localhost";
  int minimumVersion = 0;      ///< for example TLS1_2_VERSION; 0 for no limit
  int maximumVersion = 0;      ///< for example TLS1_2_VERSION; 0 for no limit
  bool demandsClient = false;  ///< demands a client certificate that chains to "authority" through "intermediate"
  bool allowsWeakness = false; ///< security level 0, without which OpenSSL offers no TLS 1.1
  std::string ciphers;         ///< of TLS 1.2, in OpenSSL's form; empty for OpenSSL's own choice
  bool resumesSessions = true;
  std::size_t tickets = 2; ///< of TLS 1.3, for each full handshake
};

/// One accepted connection, which the script controls on a separate thread. Every wait is bounded: a call that gets no
/// answer in 30 seconds, or during which the server is stopped, ends as if the peer had closed the connection.
class ServerConnection {
public:
  ServerConnection(int descriptor, ssl_ctx_st *tls);
  ServerConnection(const ServerConnection &) = delete;
  ServerConnection &operator=(const ServerConnection &) = delete;
  ~ServerConnection();

  /// Performs the handshake if the server has TLS, and returns whether it succeeded. A script calls this first, unless
  /// it disturbs the handshake.
  bool Handshake();

  /// At most `limit` bytes; empty when the peer has ended the connection in any way.
  std::string ReadSome(std::size_t limit = 65536);
  /// Exactly `length` bytes, or fewer when the peer ends the connection.
  std::string ReadExactly(std::size_t length);
  /// The bytes up to and including the first `delimiter`, or all bytes if the peer ends the connection before it. The
  /// next read continues there.
  std::string ReadUntil(std::string_view delimiter);
  /// One HTTP/1.1 request: its header, and the body that its Content-Length announces.
  std::string ReadRequest();

  /// Whether all bytes were written.
  bool Write(std::string_view bytes);

  /// Reads the bytes on the wire, without TLS.
  std::string ReadRawSome(std::size_t limit = 65536);
  bool WriteRaw(std::string_view bytes);

  /// Reads and discards until the peer ends the connection: a server that never answers.
  void Stall();

  /// Does nothing until the server is stopped; it does not read either, so that the peer's bytes fill the buffers.
  void WaitForInterrupt();

  /// Ends the connection properly: TLS's closing notice, then TCP's end. Happens by itself when the script returns.
  void Close();
  /// Ends TCP properly, without TLS's notice.
  void CloseWithoutNotice();
  /// Ends with a TCP reset.
  void Reset();

  /// Whether the bytes read so far include TLS's closing notice from the client.
  bool ReceivedClosingNotice() const;
  bool WasResumed() const;
  /// The name in the client's server name extension; empty for none.
  std::string GetServerName() const;
  /// The common name of the client's certificate; empty for none.
  std::string GetClientName() const;

  /// Ends a call that waits on another thread.
  void Interrupt() noexcept;

private:
  std::ptrdiff_t Receive(char *buffer, std::size_t length);
  void EndDescriptor() noexcept;

  std::mutex m_mutex; // guards the closing of the descriptor
  std::condition_variable m_interrupted;
  bool m_isInterrupted = false;
  int m_descriptor; // -1 when closed
  ssl_st *m_tls;    // null for none
  bool m_established = false;
  std::string m_ahead; // read, but not returned yet
};

class ScriptedServer {
public:
  /// Runs for each connection, for several at the same time. The connection ends when the script returns.
  using Script = std::function<void(ServerConnection &)>;

  /// Listens on a free port of 127.0.0.1, or of ::1. Connecting to the same number at the other of these addresses, or
  /// at 127.0.0.2, is refused.
  explicit ScriptedServer(Script script, std::optional<TlsSettings> tls = std::nullopt, bool v6 = false);
  ScriptedServer(const ScriptedServer &) = delete;
  ScriptedServer &operator=(const ScriptedServer &) = delete;
  /// Ends all connections and waits for their scripts.
  ~ScriptedServer();

  /// Changes the settings for connections that are accepted from now on.
  void ChangeTls(const TlsSettings &settings);

  int GetPort() const noexcept { return m_port.GetNumber(); }
  /// How many connections have been accepted so far.
  int GetConnectionCount() const noexcept { return m_accepted; }
  /// How many connections have a script that has not ended.
  std::size_t GetOpenCount() const;
  /// How many connections still have memory. The server releases it a moment after the script has ended.
  std::size_t GetRetainedCount() const noexcept { return m_retained; }

private:
  struct Running {
    std::unique_ptr<ServerConnection> connection;
    std::thread thread;
    bool ended = false;
  };

  void Accept();
  void Start(int descriptor);
  void Reap(bool all);

  const Script m_script;
  ssl_ctx_st *m_tls = nullptr;
  const LoopbackPort m_port;
  std::atomic<int> m_accepted{0};
  std::atomic<std::size_t> m_retained{0};
  std::atomic<bool> m_stopping{false};
  mutable std::mutex m_mutex; // guards m_running and, once there are connections, m_tls
  std::list<Running> m_running;
  std::thread m_acceptor;
};

} // namespace Testing
