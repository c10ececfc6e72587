// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading the files under tests/data.

#pragma once

#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>

namespace Testing {

/// The bytes of tests/data/`name`. @throws std::runtime_error when the file cannot be read.
inline std::string ReadDataFile(const std::string &name) {
  const std::string path = std::string(TEST_DATA_DIR) + "/" + name;
  std::ifstream file(path, std::ios::binary);
  std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
  if (!file.good() && text.empty()) {
    throw std::runtime_error("cannot read " + path);
  }
  return text;
}

} // namespace Testing
