// SPDX-License-Identifier: Apache-2.0
// The only source of the tests that is compiled with TEST_DATA_DIR: no other one depends on the project's path.

#include "support/data_file.h"

#include <fstream>
#include <iterator>
#include <stdexcept>

namespace Testing {

std::string DataPath(const std::string &name) {
  return TEST_DATA_DIR "/" + name;
}

std::string ReadDataFile(const std::string &name) {
  const std::string path = DataPath(name);
  std::ifstream file(path, std::ios::binary);
  std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
  if (!file.good() && text.empty()) {
    throw std::runtime_error("cannot read " + path);
  }
  return text;
}

} // namespace Testing
