// SPDX-License-Identifier: Apache-2.0

#include "refused_token.h"

#include "atomic_file.h"

#include <tarvel/core/exception.h>

namespace SsoClient::Tool {

RefusedToken::RefusedToken(const TokenOutputOptions &options, const OutputOptions &output)
    : m_options(options), m_output(output) {}

ServiceOptions::RefusedTokenSink RefusedToken::GetSink() {
  return [this](const std::string &xml) { Keep(xml); };
}

void RefusedToken::Keep(const std::string &xml) {
  const std::string &file = m_options.refusedFile;
  if (file.empty()) {
    m_hint = "--save-refused FILE keeps the refused token; ssoclient verify --explain then shows each check of it";
    return;
  }
  try {
    WriteFileWhole(file, xml + "\n", m_options.replace);
  } catch (const Tarvel::IOException &failure) {
    m_hint = std::string("the refused token could not be saved: ") + failure.what();
    Warn(m_hint, m_output);
    return;
  }
  const std::string place = "the refused token is in " + file + ", which is secret: it may be valid elsewhere";
  Note(place, m_output);
  m_hint = place + "; ssoclient verify --explain shows each check of it";
}

} // namespace SsoClient::Tool
