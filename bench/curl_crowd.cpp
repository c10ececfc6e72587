// SPDX-License-Identifier: Apache-2.0

#include "curl_crowd.h"

#include <algorithm>
#include <array>
#include <stdexcept>
#include <sys/epoll.h>
#include <unistd.h>

namespace Bench {

namespace {

constexpr int EVENTS = 256;
constexpr int LONGEST_WAIT_MILLISECONDS = 1000;

void Require(bool condition, const char *what) {
  if (!condition) {
    throw std::runtime_error(std::string("libcurl's multi interface: ") + what);
  }
}

std::uint32_t EventsOf(int action) {
  return (action & CURL_POLL_IN ? EPOLLIN : 0U) | (action & CURL_POLL_OUT ? EPOLLOUT : 0U);
}

int ActionOf(std::uint32_t events) {
  return (events & EPOLLIN ? CURL_CSELECT_IN : 0) | (events & EPOLLOUT ? CURL_CSELECT_OUT : 0) |
         (events & (EPOLLERR | EPOLLHUP) ? CURL_CSELECT_ERR : 0);
}

} // namespace

CurlCrowd::CurlCrowd(const std::string &url, const std::string &authorityFile, const std::string &soapAction,
                     const std::string &body, std::size_t requests)
    : m_poll(::epoll_create1(EPOLL_CLOEXEC)) {
  for (std::size_t i = 0; i < requests; ++i) {
    m_clients.push_back(std::make_unique<CurlClient>(url, authorityFile, soapAction, body));
    curl_easy_setopt(m_clients.back()->GetHandle(), CURLOPT_PRIVATE, m_clients.back().get());
    curl_easy_setopt(m_clients.back()->GetHandle(), CURLOPT_DNS_CACHE_TIMEOUT, -1L); // never removed
  }
  m_multi = curl_multi_init();
  Require(m_multi && m_poll >= 0, "it does not start");
  curl_multi_setopt(m_multi, CURLMOPT_SOCKETFUNCTION, &CurlCrowd::OnSocket);
  curl_multi_setopt(m_multi, CURLMOPT_SOCKETDATA, this);
  curl_multi_setopt(m_multi, CURLMOPT_TIMERFUNCTION, &CurlCrowd::OnTimer);
  curl_multi_setopt(m_multi, CURLMOPT_TIMERDATA, this);
  Post(1, [](const std::string &) {}); // afterwards the caches have the name and the authorities
}

CurlCrowd::~CurlCrowd() {
  m_clients.clear();
  curl_multi_cleanup(m_multi);
  ::close(m_poll);
}

void CurlCrowd::PostAll(const OnResponse &onResponse) {
  Post(m_clients.size(), onResponse);
}

void CurlCrowd::Post(std::size_t count, const OnResponse &onResponse) {
  for (std::size_t i = 0; i < count; ++i) {
    m_clients[i]->ClearResponse();
    Require(curl_multi_add_handle(m_multi, m_clients[i]->GetHandle()) == CURLM_OK, "a request is refused");
  }
  m_pending = count;
  while (m_pending > 0) {
    Wait();
    Finish(onResponse);
  }
}

void CurlCrowd::Wait() {
  std::array<epoll_event, EVENTS> events;
  int wait = LONGEST_WAIT_MILLISECONDS;
  if (m_hasTimer) {
    const auto rest = std::chrono::ceil<std::chrono::milliseconds>(m_timer - Clock::now()).count();
    wait = static_cast<int>(std::clamp<long>(rest, 0, LONGEST_WAIT_MILLISECONDS));
  }
  const int count = ::epoll_wait(m_poll, events.data(), EVENTS, wait);
  int running = 0;
  for (int i = 0; i < count; ++i) {
    const epoll_event &event = events[static_cast<std::size_t>(i)];
    curl_multi_socket_action(m_multi, event.data.fd, ActionOf(event.events), &running);
  }
  if (m_hasTimer && Clock::now() >= m_timer) {
    m_hasTimer = false;
    curl_multi_socket_action(m_multi, CURL_SOCKET_TIMEOUT, 0, &running);
  }
}

void CurlCrowd::Finish(const OnResponse &onResponse) {
  int queued = 0;
  while (const CURLMsg *const message = curl_multi_info_read(m_multi, &queued)) {
    const CURLcode code = message->data.result;
    CURL *const handle = message->easy_handle;
    CurlClient *client = nullptr;
    curl_easy_getinfo(handle, CURLINFO_PRIVATE, &client);
    curl_multi_remove_handle(m_multi, handle);
    --m_pending;
    if (code != CURLE_OK) {
      throw std::runtime_error(curl_easy_strerror(code));
    }
    onResponse(client->GetResponse());
  }
}

int CurlCrowd::OnSocket(CURL *, curl_socket_t descriptor, int action, void *crowd, void *known) {
  auto &self = *static_cast<CurlCrowd *>(crowd);
  epoll_event event{};
  event.data.fd = descriptor;
  if (action == CURL_POLL_REMOVE) {
    ::epoll_ctl(self.m_poll, EPOLL_CTL_DEL, descriptor, &event);
    return 0;
  }
  event.events = EventsOf(action);
  ::epoll_ctl(self.m_poll, known ? EPOLL_CTL_MOD : EPOLL_CTL_ADD, descriptor, &event);
  curl_multi_assign(self.m_multi, descriptor, crowd);
  return 0;
}

int CurlCrowd::OnTimer(CURLM *, long milliseconds, void *crowd) {
  auto &self = *static_cast<CurlCrowd *>(crowd);
  self.m_hasTimer = milliseconds >= 0;
  self.m_timer = Clock::now() + std::chrono::milliseconds(milliseconds);
  return 0;
}

} // namespace Bench
