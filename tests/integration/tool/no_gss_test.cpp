// SPDX-License-Identifier: Apache-2.0
// What --gss does in a tool that is built without the GSSAPI.

#include "expect_result.h"
#include "process.h"

#include <gtest/gtest.h>

namespace ToolTest {
namespace {

constexpr const char *LINE = "ssoclient acquire --sts https://127.0.0.1:9/sts --trust sts-rsa.crt --gss ";

TEST(ToolWithoutGssapi, RefusesTheOptionInOneLine) {
  ExpectResult(RunShell(LINE), 2, "",
               "ssoclient: usage: --gss is not available: this ssoclient is built without the GSSAPI\n");
}

TEST(ToolWithoutGssapi, RefusesTheOptionInJson) {
  ExpectResult(RunShell(std::string(LINE) + "--format json"), 2, "",
               R"({"schema":1,"error":{"class":"UsageException","message":"--gss is not available: this ssoclient is )"
               "built without the GSSAPI\"}}\n");
}

} // namespace
} // namespace ToolTest
