// SPDX-License-Identifier: Apache-2.0
/// @file
/// libcurl, the peer with which an exchange is compared.

#pragma once

#include <curl/curl.h>

#include <memory>
#include <string>

namespace Bench {

/// Posts one SOAP request repeatedly, each time over a new TLS connection. It uses libcurl as an experienced host
/// would: one handle for all requests, which keeps the parsed authorities and the sessions, and the same headers and
/// limits as our client. For one thread at a time.
class CurlClient {
public:
  /// @param authorityFile PEM certificates of authorities; the server's certificate must chain to one of them.
  /// @param soapAction without quotes.
  CurlClient(const std::string &url, const std::string &authorityFile, const std::string &soapAction,
             const std::string &body);

  CurlClient(const CurlClient &) = delete;
  CurlClient &operator=(const CurlClient &) = delete;

  /// The body of the response, valid until the next call. @throws std::runtime_error
  const std::string &Post();

  /// The prepared request, for use in a multi interface.
  CURL *GetHandle() const noexcept { return m_handle.get(); }
  const std::string &GetResponse() const noexcept { return m_response; }
  void ClearResponse() noexcept { m_response.clear(); }

private:
  template <typename T>
  void Set(CURLoption option, T value);
  static std::size_t Append(const char *bytes, std::size_t size, std::size_t count, void *response);

  const std::string m_body;
  std::string m_response;
  std::unique_ptr<curl_slist, void (*)(curl_slist *)> m_headers{nullptr, &curl_slist_free_all};
  std::unique_ptr<CURL, void (*)(CURL *)> m_handle;
};

} // namespace Bench
