// SPDX-License-Identifier: Apache-2.0
// The only source that is compiled with the paths of the project and of built files, so that no other source depends on
// them.

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

std::string SearchingMemoryPath() {
  return SEARCHING_MEMORY;
}

std::string ExampleAcquirePath() {
  return EXAMPLE_ACQUIRE;
}

std::string ExampleOtherServicePath() {
  return EXAMPLE_OTHER_SERVICE;
}

} // namespace ToolTest
