// SPDX-License-Identifier: Apache-2.0
/// @file
/// A folder of a test's own.

#pragma once

#include <set>
#include <string>

namespace Testing {

/// A new, empty folder that goes with all that is in it at the end.
class WorkFolder {
public:
  WorkFolder();
  WorkFolder(const WorkFolder &) = delete;
  WorkFolder &operator=(const WorkFolder &) = delete;
  ~WorkFolder();

  const std::string &Path() const { return m_path; }
  std::string operator/(const std::string &name) const { return m_path + "/" + name; }

  /// Writes a file; its path.
  std::string Write(const std::string &name, const std::string &content) const;

  std::string Read(const std::string &name) const;

  /// The names of everything in it, hidden files included.
  std::set<std::string> Names() const;

private:
  std::string m_path;
};

} // namespace Testing
