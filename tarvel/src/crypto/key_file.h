// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading a file of keys or certificates, and saying in each error which file it was.

#pragma once

#include <tarvel/core/secure_wipe.h>
#include <tarvel/core/string_util.h>
#include <tarvel/crypto/private_key.h>

#include <string>
#include <utility>

namespace Tarvel::Crypto {

/// What a file holds. It may be a private key: the text is wiped when it goes.
class KeyFileText {
public:
  /// @throws IOException when the file cannot be read. @throws CryptoException when it is longer than 16 MiB.
  explicit KeyFileText(const std::string &path);
  KeyFileText(const KeyFileText &) = delete;
  KeyFileText &operator=(const KeyFileText &) = delete;
  ~KeyFileText() { SecureWipe(m_text); }

  std::string_view Get() const { return m_text; }

private:
  std::string m_text;
};

/// What `function` returns; its `CryptoException` or `IOException` comes as the same class, the message beginning with
/// `path`.
template <typename Function>
auto WithPathInErrors(const std::string &path, Function function) {
  try {
    return function();
  } catch (const WrongPassphraseException &error) {
    throw WrongPassphraseException(StringUtil::Shorten(path) + ": " + error.what());
  } catch (const NoKeyException &error) {
    throw NoKeyException(StringUtil::Shorten(path) + ": " + error.what());
  } catch (const CryptoException &error) {
    throw CryptoException(StringUtil::Shorten(path) + ": " + error.what());
  } catch (const IOException &error) {
    throw IOException(StringUtil::Shorten(path) + ": " + error.what());
  }
}

} // namespace Tarvel::Crypto
