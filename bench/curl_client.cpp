// SPDX-License-Identifier: Apache-2.0

#include "curl_client.h"

#include <stdexcept>

namespace Bench {

namespace {

constexpr long TIMEOUT_SECONDS = 240;

CURL *CreateHandle() {
  static const CURLcode started = curl_global_init(CURL_GLOBAL_DEFAULT);
  CURL *const handle = started == CURLE_OK ? curl_easy_init() : nullptr;
  if (!handle) {
    throw std::runtime_error("libcurl does not start");
  }
  return handle;
}

} // namespace

CurlClient::CurlClient(const std::string &url, const std::string &authorityFile, const std::string &soapAction,
                       const std::string &body)
    : m_body(body), m_handle(CreateHandle(), &curl_easy_cleanup) {
  Set(CURLOPT_URL, url.c_str());
  Set(CURLOPT_CAINFO, authorityFile.c_str());
  Set(CURLOPT_CAPATH, static_cast<const char *>(nullptr));
  Set(CURLOPT_TIMEOUT, TIMEOUT_SECONDS);
  Set(CURLOPT_NOSIGNAL, 1L);
  Set(CURLOPT_FRESH_CONNECT, 1L);
  Set(CURLOPT_FORBID_REUSE, 1L);
  Set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
  Set(CURLOPT_POSTFIELDS, m_body.c_str());
  Set(CURLOPT_POSTFIELDSIZE, static_cast<long>(m_body.size()));
  const std::string action = "SOAPAction: \"" + soapAction + '"';
  for (const char *header :
       {"Content-Type: text/xml", action.c_str(), "User-Agent: tarvel", "Accept:", "Connection: close", "Expect:"}) {
    m_headers.reset(curl_slist_append(m_headers.release(), header));
  }
  Set(CURLOPT_HTTPHEADER, m_headers.get());
  Set(CURLOPT_WRITEFUNCTION, &CurlClient::Append);
  Set(CURLOPT_WRITEDATA, &m_response);
}

const std::string &CurlClient::Post() {
  m_response.clear();
  if (const CURLcode code = curl_easy_perform(m_handle.get()); code != CURLE_OK) {
    throw std::runtime_error(curl_easy_strerror(code));
  }
  return m_response;
}

template <typename T>
void CurlClient::Set(CURLoption option, T value) {
  if (curl_easy_setopt(m_handle.get(), option, value) != CURLE_OK) {
    throw std::runtime_error("libcurl refuses an option");
  }
}

std::size_t CurlClient::Append(const char *bytes, std::size_t size, std::size_t count, void *response) {
  static_cast<std::string *>(response)->append(bytes, size * count);
  return size * count;
}

} // namespace Bench
