// SPDX-License-Identifier: Apache-2.0

#include "message_files.h"

#include "support/data_file.h"

#include <sstream>

namespace Messages {

const std::vector<MessageFile> &AllMessageFiles() {
  static const std::vector<MessageFile> files = [] {
    std::vector<MessageFile> read;
    std::istringstream lines(Testing::ReadDataFile("messages/attacks/expected.tsv"));
    for (std::string line; std::getline(lines, line);) {
      std::istringstream fields(line);
      MessageFile &file = read.emplace_back();
      std::getline(fields, file.name, '\t');
      std::getline(fields, file.options, '\t');
      std::getline(fields, file.exceptionClass, '\t');
      std::getline(fields, file.text);
      file.xml = Testing::ReadDataFile("messages/attacks/" + file.name + ".xml");
    }
    return read;
  }();
  return files;
}

} // namespace Messages
