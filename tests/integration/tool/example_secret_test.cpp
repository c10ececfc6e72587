// SPDX-License-Identifier: Apache-2.0
// The example that acquires by password is a model for other programs: it must not leave the password in memory.

#include "built_files.h"
#include "process.h"

#include "support/dev_sts.h"
#include "support/work_folder.h"

#include <gmock/gmock.h>

#include <string>

namespace ToolTest {
namespace {

// Too long for the buffer inside std::string, so that a string that grows leaves copies in the heap.
constexpr const char *LONG_PASSWORD = "wonderland-and-what-alice-found-there";

TEST(ExampleAcquire, LeavesNoCopyOfThePasswordInMemory) {
  const Testing::WorkFolder folder;
  const std::string password = folder.Write("password.txt", std::string(LONG_PASSWORD) + "\n");
  const std::string users = folder.Write("users.json", std::string(R"([{"name":"alice@corp.example","password":")") +
                                                           LONG_PASSWORD + R"("}])");
  const Testing::DevSts service({"--users", users});
  const auto search = [&](std::string text) {
    return RunShell("REVERSED_TEXT=" + std::string(text.rbegin(), text.rend()) +
                    " LD_PRELOAD=" + SearchingMemoryPath() + " " + ExampleAcquirePath() + " " + service.GetUrl() + " " +
                    service.PathOf("authority.crt") + " " + service.PathOf("signing.crt") + " alice@corp.example <" +
                    password + " >/dev/null");
  };
  const Result forPassword = search(LONG_PASSWORD);
  EXPECT_EQ(forPassword.exitCode, 0) << forPassword.err;
  EXPECT_THAT(forPassword.err, testing::MatchesRegex("acquired _.*\nfound 0 times\n"));
  // The search finds a text that is in memory.
  EXPECT_THAT(search("alice@corp.example").err, testing::MatchesRegex("acquired _.*\nfound [1-9][0-9]* times\n"));
}

} // namespace
} // namespace ToolTest
