// SPDX-License-Identifier: Apache-2.0
/// @file
/// A folder of a test's own.

#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>
#include <stdexcept>
#include <string>

#include <stdlib.h>

namespace Testing {

/// A new, empty folder that goes with all that is in it at the end.
class WorkFolder {
public:
  WorkFolder() : m_path(testing::TempDir() + "ssoclient_XXXXXX") {
    if (!mkdtemp(m_path.data())) {
      throw std::runtime_error("mkdtemp");
    }
  }
  WorkFolder(const WorkFolder &) = delete;
  WorkFolder &operator=(const WorkFolder &) = delete;
  ~WorkFolder() { std::filesystem::remove_all(m_path); }

  const std::string &Path() const { return m_path; }
  std::string operator/(const std::string &name) const { return m_path + "/" + name; }

  /// Writes a file; its path.
  std::string Write(const std::string &name, const std::string &content) const {
    std::ofstream(*this / name, std::ios::binary) << content;
    return *this / name;
  }

  std::string Read(const std::string &name) const {
    std::ifstream file(*this / name, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }

  /// The names of everything in it, hidden files included.
  std::set<std::string> Names() const {
    std::set<std::string> names;
    for (const auto &entry : std::filesystem::directory_iterator(m_path)) {
      names.insert(entry.path().filename());
    }
    return names;
  }

private:
  std::string m_path;
};

} // namespace Testing
