// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenCacheFile`, a file in which programs of one user share a token.

#pragma once

#include <ssoclient/client/token_source.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_spec.h>
#include <tarvel/io/private_file.h>

#include <functional>
#include <memory>
#include <string>

namespace SsoClient {

/// What a cached token belongs to. A token of another binding is not returned.
struct CacheBinding {
  std::string serviceUrl;
  std::string owner; ///< user name, principal, or "certificate:" and the SHA-256 thumbprint; never a secret
  TokenSpec spec;
  std::string options; ///< what else determines the token, for example its profile and its type
};

/// Safe on any thread. Its functions block: they read and write files. None of them waits for another program.
class TokenCacheFile {
public:
  using Verify = std::function<std::shared_ptr<const SamlToken>(const std::string &xml)>;

  /// Does not touch the file.
  /// @param verify makes a token of its XML, or throws
  /// @throws Tarvel::InvalidArgumentException when the path is empty or contains a NUL
  TokenCacheFile(std::string path, CacheBinding binding, Verify verify);

  /// The exclusive lock of the file, held until it is destroyed or the process ends. For one thread at a time.
  using Lock = Tarvel::PrivateFileLock;

  /// Tries to lock the file; null when another program, or another lock of this program, has locked it.
  /// @throws Tarvel::IOException when the file is refused or cannot be made
  std::unique_ptr<Lock> TryLock() const { return m_file.TryLock(); }

  /// The same, but makes no file: also null when there is no file.
  /// @throws Tarvel::IOException when the file is refused
  std::unique_ptr<Lock> TryLockExisting() const { return m_file.TryLockExisting(); }

  /// The token of this binding, verified again. Null when there is no file, or when the file is empty or truncated, has
  /// another version or another binding, or has a token that is refused now. Needs no lock.
  /// @throws Tarvel::IOException when the file is refused (a link, another owner, a mode that lets other users read or
  ///         write it, or the content of another kind of file, which must not be lost) or cannot be read; what `verify`
  ///         throws, unless it is the refusal of a token
  std::shared_ptr<const SamlToken> Read() const;

  /// Replaces the content as a whole; readers see the old or the new content.
  /// @throws Tarvel::IOException when it cannot be written, for example on a full disk; the old content then stays, and
  ///         no other file remains.
  void Write(Lock &lock, const SamlToken &token) const;

  /// Whether the file has the token with this identifier and this binding. Needs no lock.
  /// @throws Tarvel::IOException when the file is refused or cannot be read
  bool Contains(const std::string &tokenId) const;

  /// Removes the token from the file, if it is the one with this identifier and has this binding.
  /// @throws Tarvel::IOException when the file cannot be read or written
  void Remove(Lock &lock, const std::string &tokenId) const;

private:
  std::string m_path;
  Tarvel::PrivateFile m_file;
  CacheBinding m_binding;
  Verify m_verify;
};

} // namespace SsoClient
