// SPDX-License-Identifier: Apache-2.0

#include "redis_replay_guard.h"

#include <tarvel/system/date_time.h>

#include <cstdint>
#include <stdexcept>
#include <utility>

namespace {

using Answer = SsoClient::ReplayGuard::Answer;

constexpr std::size_t MAX_IDLE_CONNECTIONS = 16;
constexpr int MAX_PORT = 65535;
constexpr std::int64_t MICROSECONDS_PER_MILLISECOND = 1000;

std::string KeyOf(const SsoClient::MessageIdentifier &identifier) {
  constexpr const char *DIGITS = "0123456789abcdef";
  std::string key = "sso-message:";
  for (const std::uint8_t octet : identifier) {
    key += DIGITS[octet >> 4];
    key += DIGITS[octet & 15];
  }
  return key;
}

int ParsePort(const std::string &text) {
  try {
    std::size_t length = 0;
    const int port = std::stoi(text, &length);
    return length == text.size() && port > 0 && port <= MAX_PORT ? port : 0;
  } catch (const std::exception &) {
    return 0;
  }
}

// SET with NX sets the key only if it does not exist, in one step: the server answers OK, or nil if the key exists.
Answer ReadAnswer(const redisReply &reply) {
  if (reply.type == REDIS_REPLY_STATUS && std::string(reply.str, reply.len) == "OK") {
    return Answer::FIRST;
  }
  return reply.type == REDIS_REPLY_NIL ? Answer::REPEATED : Answer::UNAVAILABLE;
}

} // namespace

RedisReplayGuard::RedisReplayGuard(const std::string &address, std::chrono::milliseconds timeout) {
  const std::string scheme = "unix:";
  const std::size_t colon = address.rfind(':');
  if (address.compare(0, scheme.size(), scheme) == 0) {
    m_path = address.substr(scheme.size());
  } else if (colon != std::string::npos && colon > 0) {
    m_host = address.substr(0, colon);
    m_port = ParsePort(address.substr(colon + 1));
  }
  if (m_path.empty() && m_port == 0) {
    throw std::invalid_argument(address + " is not the address of a Redis server");
  }
  m_timeout.tv_sec = static_cast<time_t>(timeout.count() / 1000);
  m_timeout.tv_usec = static_cast<suseconds_t>(timeout.count() % 1000 * 1000);
}

Answer RedisReplayGuard::Remember(const SsoClient::MessageIdentifier &identifier,
                                  const Tarvel::System::DateTime &until) {
  // The server counts the time itself, so its clock need not be right. It must not forget the message too early.
  const std::int64_t remaining = until.MicrosecondsSince(Tarvel::System::GetUtcDateTime());
  if (remaining <= 0) {
    return Answer::UNAVAILABLE;
  }
  const std::string milliseconds = std::to_string(remaining / MICROSECONDS_PER_MILLISECOND + 1);
  const std::string key = KeyOf(identifier);
  // An idle connection may have ended, for example because the server was restarted. If its command has still been
  // executed, the second answer is REPEATED: a message is refused, and never accepted twice.
  for (bool isIdle : {true, false}) {
    Connection connection = isIdle ? FindIdle() : Connect();
    const Reply reply(connection ? static_cast<redisReply *>(redisCommand(connection.get(), "SET %s 1 NX PX %s",
                                                                          key.c_str(), milliseconds.c_str()))
                                 : nullptr);
    if (reply) {
      Keep(std::move(connection));
      return ReadAnswer(*reply);
    }
  }
  return Answer::UNAVAILABLE;
}

RedisReplayGuard::Connection RedisReplayGuard::Connect() const {
  Connection connection(m_path.empty() ? redisConnectWithTimeout(m_host.c_str(), m_port, m_timeout)
                                       : redisConnectUnixWithTimeout(m_path.c_str(), m_timeout));
  const bool isUsable = connection && connection->err == 0 && redisSetTimeout(connection.get(), m_timeout) == REDIS_OK;
  return isUsable ? std::move(connection) : nullptr;
}

RedisReplayGuard::Connection RedisReplayGuard::FindIdle() {
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (m_idle.empty()) {
    return nullptr;
  }
  Connection connection = std::move(m_idle.back());
  m_idle.pop_back();
  return connection;
}

void RedisReplayGuard::Keep(Connection connection) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (m_idle.size() < MAX_IDLE_CONNECTIONS) {
    m_idle.push_back(std::move(connection));
  }
}
