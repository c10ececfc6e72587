// SPDX-License-Identifier: Apache-2.0

#include "support/http_request_text.h"

#include <sstream>

namespace Testing {

namespace {

void ReadField(const std::string &line, SsoClient::HttpRequest &request) {
  if (!line.empty() && line.front() == ' ' && !request.headers.empty()) {
    request.headers.back().second += "\r\n" + line;
    return;
  }
  const std::size_t colon = line.find(": ");
  request.headers.emplace_back(line.substr(0, colon), colon == std::string::npos ? "" : line.substr(colon + 2));
}

} // namespace

SsoClient::HttpRequest ParseHttpRequest(const std::string &text) {
  const std::size_t end = text.find("\n\n");
  std::istringstream head(text.substr(0, end));
  SsoClient::HttpRequest request;
  std::string line;
  std::getline(head, line);
  const std::size_t blank = line.find(' ');
  request.method = line.substr(0, blank);
  request.targetUri = blank == std::string::npos ? "" : line.substr(blank + 1);
  while (std::getline(head, line)) {
    ReadField(line, request);
  }
  if (end != std::string::npos && end + 2 < text.size()) {
    request.body = text.substr(end + 2);
  }
  return request;
}

std::string WriteHttpRequest(const SsoClient::HttpRequest &request) {
  std::string text = request.method + ' ' + request.targetUri + '\n';
  for (const auto &[name, value] : request.headers) {
    text.append(name).append(": ").append(value).append("\n");
  }
  return text + '\n' + request.body.value_or("");
}

} // namespace Testing
