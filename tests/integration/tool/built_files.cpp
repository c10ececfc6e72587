// SPDX-License-Identifier: Apache-2.0
// The only source that is compiled with PROJECT_FOLDER, SSOCLIENT_TOOL and INTERRUPTING_FSYNC: no other one depends on
// where the project and its build are.

#include "built_files.h"

namespace ToolTest {

std::string ProjectPath(const std::string &name) {
  return PROJECT_FOLDER "/" + name;
}

std::string ToolPath() {
  return SSOCLIENT_TOOL;
}

std::string InterruptingFsyncPath() {
  return INTERRUPTING_FSYNC;
}

} // namespace ToolTest
