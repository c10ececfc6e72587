// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one implementation of `ClientResponse`, for a response that has been read completely.

#pragma once

#include "http/response_reader.h"

#include <tarvel/http/user_agent.h>

#include <cstddef>
#include <string>
#include <string_view>

namespace Tarvel::Http {

class ClientResponseImpl final : public ClientResponse {
public:
  explicit ClientResponseImpl(ResponseData data);

  std::size_t Read(char *buffer, std::size_t length) override;
  std::string ReadToEnd(std::size_t maximumBytes) override;
  std::string GetDeclaredCharset() const override;
  int GetStatusCode() const noexcept override;
  const std::string &GetReasonPhrase() const noexcept override;
  bool GetHeader(std::string_view name, std::string &value) const override;
  std::size_t GetBodyLength() const noexcept override;

private:
  ~ClientResponseImpl() override = default;

  ResponseData m_data;
  const std::size_t m_bodyLength; // as received
  std::size_t m_position = 0;     // in the body
};

} // namespace Tarvel::Http
