// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one implementation of `TcpClientSocket`, over Asio's socket.

#pragma once

#include "core/fork_gate.h"
#include "system/io_engine.h"
#include "system/name_lookup.h"

#include <tarvel/system/stream.h>

#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/steady_timer.hpp>

#include <chrono>
#include <exception>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace Tarvel::System {

/// How long a connect waits for one address of a name when other addresses remain: long enough for a lost packet to be
/// sent again twice.
constexpr std::chrono::seconds MAX_ATTEMPT_TIME{5};

class TcpClientSocketImpl final : public TcpClientSocket, private ClosesInChild {
public:
  /// Called within a computation.
  TcpClientSocketImpl();

  void AsyncConnect(const std::string &host, int port, ConnectHandler handler) override;
  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override;
  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override;
  void Close() noexcept override;

  /// Whether the connect has ended, with or without success, or can no longer be started.
  bool IsConnectDone() const noexcept;

private:
  enum class Stage { FRESH, CONNECTING, CONNECTED, ENDED };

  ~TcpClientSocketImpl() override;

  void CloseInChild() noexcept override;

  // The connect. All functions except those that begin with "On" are called under the lock.
  void StartConnect(const std::string &host);
  void OnLookup(const AddressList &addresses, const std::exception_ptr &failure);
  void TryAddresses(AddressList addresses);
  void TryNextAddress();
  bool OpenSocket(const boost::asio::ip::tcp::endpoint &endpoint, boost::system::error_code &error);
  void OnConnectAttempt(const boost::system::error_code &error);
  void LimitAttempt();
  void NoteFailedAttempt(const boost::system::error_code &error);
  template <typename Step>
  void TryStep(const Step &step) noexcept;
  void EndConnect(std::string_view reason) noexcept;
  void OnConnectEnd();

  struct PendingWrite;
  void WriteSome(const std::shared_ptr<PendingWrite> &pending);
  void OnWritten(const std::shared_ptr<PendingWrite> &pending, const boost::system::error_code &error,
                 std::size_t count);
  void OnRead(const TransferHandler &handler, const boost::system::error_code &error, std::size_t count);
  void CompleteRead(const TransferHandler &handler, const boost::system::error_code &error, std::size_t count) const;

  NetworkException DescribeTransferFailure(const boost::system::error_code &error) const noexcept;

  const SocketContext m_context;
  mutable ForkSafeMutex m_mutex; // guards all that follows; never held while a handler runs
  boost::asio::ip::tcp::socket m_socket;
  Stage m_stage = Stage::FRESH;
  bool m_isOfParent = false; // inherited by `fork`; the parent's handlers are never called
  std::string m_target;      // "host:port" or "[v6 address]:port", for messages; set once
  int m_port = 0;

  // How reading and writing ended. Kept, because another read or write in Asio may wait forever.
  boost::system::error_code m_readEnd;
  boost::system::error_code m_writeEnd;

  // While connecting.
  ConnectHandler m_connectHandler;
  boost::asio::steady_timer m_connectEnd; // never expires; cancelling it calls the handler, which needs no memory
  std::optional<NetworkException> m_connectFailure;
  Ref<ScheduledItem> m_lookup;
  AddressList m_addresses;
  std::size_t m_nextAddress = 0;
  std::string m_attempts; // why the addresses tried so far failed
  boost::asio::steady_timer m_attemptTimer;
  bool m_isAttemptOverdue = false;
};

} // namespace Tarvel::System
