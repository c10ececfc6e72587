// SPDX-License-Identifier: Apache-2.0
/// @file
/// A temporary folder for one test.

#pragma once

#include <set>
#include <string>

namespace Testing {

/// A new, empty folder, which is removed at the end with everything in it.
class WorkFolder {
public:
  WorkFolder();
  WorkFolder(const WorkFolder &) = delete;
  WorkFolder &operator=(const WorkFolder &) = delete;
  ~WorkFolder();

  const std::string &Path() const { return m_path; }
  std::string operator/(const std::string &name) const { return m_path + "/" + name; }

  /// Writes a file and returns its path.
  std::string Write(const std::string &name, const std::string &content) const;

  std::string Read(const std::string &name) const;

  /// The names of everything in it, hidden files included.
  std::set<std::string> Names() const;

private:
  std::string m_path;
};

} // namespace Testing
