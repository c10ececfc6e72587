// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading files of keys or certificates, and adding their paths to errors.

#pragma once

#include <tarvel/core/secret_text.h>
#include <tarvel/core/string_util.h>
#include <tarvel/crypto/private_key.h>

#include <string>

namespace Tarvel::Crypto {

/// The content of a file, which may be a private key.
/// @throws IOException when the file cannot be read. @throws CryptoException when it is longer than 16 MiB.
SecretText ReadKeyFile(const std::string &path);

/// Returns what `function` returns. If it throws a `CryptoException` or an `IOException`, throws one of the same class whose
/// message begins with `path`.
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
