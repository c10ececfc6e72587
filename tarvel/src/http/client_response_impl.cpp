// SPDX-License-Identifier: Apache-2.0

#include "http/client_response_impl.h"

#include "http/charset.h"

#include <algorithm>
#include <utility>

namespace Tarvel::Http {

ClientResponseImpl::ClientResponseImpl(ResponseData data) : m_data(std::move(data)), m_bodyLength(m_data.body.size()) {
  RecodeToUtf8(m_data.body, GetDeclaredCharset());
}

std::size_t ClientResponseImpl::Read(char *buffer, std::size_t length) {
  const std::size_t count = m_data.body.copy(buffer, length, m_position);
  m_position += count;
  return count;
}

std::string ClientResponseImpl::ReadToEnd(std::size_t) {
  std::string rest = std::exchange(m_data.body, std::string());
  rest.erase(0, std::exchange(m_position, 0));
  return rest;
}

std::string ClientResponseImpl::GetDeclaredCharset() const {
  std::string contentType;
  GetHeader("Content-Type", contentType);
  return FindCharset(contentType);
}

int ClientResponseImpl::GetStatusCode() const noexcept {
  return m_data.status;
}

const std::string &ClientResponseImpl::GetReasonPhrase() const noexcept {
  return m_data.reason;
}

bool ClientResponseImpl::GetHeader(std::string_view name, std::string &value) const {
  const auto found = std::find_if(m_data.fields.begin(), m_data.fields.end(),
                                  [name](const auto &field) { return EqualsIgnoringCase(field.first, name); });
  if (found == m_data.fields.end()) {
    return false;
  }
  value = found->second;
  return true;
}

std::size_t ClientResponseImpl::GetBodyLength() const noexcept {
  return m_bodyLength;
}

} // namespace Tarvel::Http
