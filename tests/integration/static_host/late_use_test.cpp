// SPDX-License-Identifier: Apache-2.0
// What the host's workers may do while static objects wait for them.
#include "host_programs.h"

#include <gtest/gtest.h>

namespace Testing {
namespace {

TEST(StaticObjectThatJoinsAWorker, IsDestroyedWhileTheWorkerComputes) {
  EXPECT_EQ(RunHost(LATE_HOST_PROGRAM),
            "main ends\n"
            "tokens/bearer.xml: {Name: alice; Domain:corp.example}\n"
            "tokens/signed-by-other.xml failed: "
            "Failed to verify signature: token might have been tampered with.\n"
            "joined\n"
            "computed: {Name: alice; Domain:corp.example}\n"
            "tokens/expired.xml failed: The token has expired at: 2021-01-01T00:00:00.000Z\n"
            "joined\n");
}

} // namespace
} // namespace Testing
