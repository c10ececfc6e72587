// SPDX-License-Identifier: Apache-2.0

#include "token_files.h"

#include "support/data_file.h"

#include <algorithm>
#include <filesystem>

namespace Reports {

std::vector<TokenFile> ReadTokenFiles(const std::string &folder) {
  std::vector<TokenFile> files;
  for (const auto &entry : std::filesystem::directory_iterator(Testing::DataPath(folder))) {
    if (entry.path().extension() == ".xml") {
      const std::string name = folder + "/" + entry.path().filename().string();
      files.push_back({name, Testing::ReadDataFile(name)});
    }
  }
  std::sort(files.begin(), files.end(), [](const auto &one, const auto &other) { return one.name < other.name; });
  return files;
}

const std::vector<TokenFile> &AllTokenFiles() {
  static const std::vector<TokenFile> all = [] {
    std::vector<TokenFile> files;
    for (const char *const folder : {"tokens", "attacks", "saml2", "requests"}) {
      for (TokenFile &file : ReadTokenFiles(folder)) {
        files.push_back(std::move(file));
      }
    }
    return files;
  }();
  return all;
}

} // namespace Reports
