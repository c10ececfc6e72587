// SPDX-License-Identifier: Apache-2.0
/// @file
/// Descriptors that the tool reads from, and the rule that each is read for one purpose only.

#pragma once

#include <map>
#include <string>

namespace SsoClient::Tool {

/// Owns a descriptor and closes it, unless it is standard input.
class InputDescriptor {
public:
  /// Opens the file `path`; "-" is standard input. @throws Tarvel::IOException whose message has the path.
  explicit InputDescriptor(const std::string &path);
  /// Becomes the owner of `descriptor`.
  explicit InputDescriptor(int descriptor) noexcept : m_descriptor(descriptor) {}
  InputDescriptor(const InputDescriptor &) = delete;
  InputDescriptor &operator=(const InputDescriptor &) = delete;
  ~InputDescriptor();

  int Get() const noexcept { return m_descriptor; }

private:
  int m_descriptor;
};

/// Records which option reads which of the descriptors that the process was started with.
class InputClaims {
public:
  /// `option` reads the file `path`. Only "-", standard input, is recorded: files may be read twice.
  /// @throws UsageException when another option reads standard input too.
  void ClaimFile(const std::string &path, const std::string &option);
  /// `option` reads `descriptor`, unless that is negative. @throws UsageException when another option reads it too.
  void ClaimDescriptor(int descriptor, const std::string &option);

private:
  std::map<int, std::string> m_options;
};

} // namespace SsoClient::Tool
