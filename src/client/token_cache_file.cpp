// SPDX-License-Identifier: Apache-2.0

#include "client/token_cache_file.h"

#include "client/token_cache_text.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/xml/parser.h>

#include <utility>

namespace SsoClient {

namespace {

bool HasToken(const std::string &text, const CacheBinding &binding, const std::string &tokenId) {
  const boost::optional<CachedToken> cached = FindCachedToken(text, binding);
  return cached && cached->id == CacheValue(tokenId);
}

} // namespace

TokenCacheFile::TokenCacheFile(std::string path, CacheBinding binding, Verify verify)
    : m_path(path), m_file(std::move(path)), m_binding(std::move(binding)), m_verify(std::move(verify)) {}

std::shared_ptr<const SamlToken> TokenCacheFile::Read() const {
  const boost::optional<std::string> text = m_file.Read();
  // It may be a key or a password that was named by mistake, and must not be replaced.
  if (text && !IsCacheText(*text)) {
    throw Tarvel::IOException("Cannot use " + Tarvel::StringUtil::Shorten(m_path) + ": it is not a token cache");
  }
  const boost::optional<CachedToken> cached = text ? FindCachedToken(*text, m_binding) : boost::none;
  if (!cached) {
    return nullptr;
  }
  try {
    std::shared_ptr<const SamlToken> token = m_verify(std::string(cached->xml));
    // `Remove` compares the identifier that the file states, so it must be the token's.
    return token && CacheValue(token->GetId()) == cached->id ? token : nullptr;
  } catch (const SsoException &) {
    return nullptr;
  } catch (const Tarvel::Xml::XMLParseException &) {
    return nullptr;
  }
}

void TokenCacheFile::Write(Lock &lock, const SamlToken &token) const {
  lock.Replace(WriteCacheText(m_binding, token));
}

bool TokenCacheFile::Contains(const std::string &tokenId) const {
  const boost::optional<std::string> text = m_file.Read();
  return text && HasToken(*text, m_binding, tokenId);
}

void TokenCacheFile::Remove(Lock &lock, const std::string &tokenId) const {
  if (HasToken(lock.Read(), m_binding, tokenId)) {
    lock.Clear();
  }
}

} // namespace SsoClient
