// SPDX-License-Identifier: Apache-2.0

#include "support/work_folder.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <system_error>

#include <stdlib.h>

namespace Testing {

WorkFolder::WorkFolder() : m_path(testing::TempDir() + "ssoclient_XXXXXX") {
  if (!mkdtemp(m_path.data())) {
    throw std::runtime_error("mkdtemp");
  }
}

WorkFolder::~WorkFolder() {
  std::error_code error;
  std::filesystem::remove_all(m_path, error);
  if (error) { // for example, because something still writes into the folder after the end of the test
    ADD_FAILURE() << "cannot remove " << m_path << ": " << error.message();
  }
}

std::string WorkFolder::Write(const std::string &name, const std::string &content) const {
  std::ofstream(*this / name, std::ios::binary) << content;
  return *this / name;
}

std::string WorkFolder::Read(const std::string &name) const {
  std::ifstream file(*this / name, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

std::set<std::string> WorkFolder::Names() const {
  std::set<std::string> names;
  for (const auto &entry : std::filesystem::directory_iterator(m_path)) {
    names.insert(entry.path().filename());
  }
  return names;
}

} // namespace Testing
