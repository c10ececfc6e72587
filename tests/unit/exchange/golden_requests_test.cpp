// SPDX-License-Identifier: Apache-2.0
// Compares every request byte for byte with its file in tests/data/requests. A change of the wire format appears as a
// difference in these files. With SSOCLIENT_UPDATE_GOLDEN=1 the test writes the files again, and then fails, so every
// change is noticed.
#include "support/data_file.h"
#include "support/dialect_requests.h"
#include "support/fixed_environment.h"
#include "support/wire_layout.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <string>

namespace SsoClient {
namespace {

using namespace Testing;

class GoldenRequest : public testing::TestWithParam<SampleRequest> {};

TEST_P(GoldenRequest, EqualsItsFileByteForByte) {
  const FixedEnvironment environment;
  Request request;
  GetParam().build(request);
  const std::string file = std::string("requests/") + GetParam().name + ".xml";
  const std::string readable = ToReadable(request.body);
  ASSERT_EQ(ToWire(readable), request.body) << "the readable form does not contain the whole message";
  if (std::getenv("SSOCLIENT_UPDATE_GOLDEN")) {
    std::ofstream(DataPath(file), std::ios::binary) << readable;
    FAIL() << "wrote " << file;
  }
  const std::string golden = ReadDataFile(file);
  EXPECT_EQ(readable, golden);
  EXPECT_EQ(request.body, ToWire(golden));
}

INSTANTIATE_TEST_SUITE_P(EveryOperation, GoldenRequest, testing::ValuesIn(SampleRequestsInAllDialects()),
                         [](const auto &sample) { return TestName(sample.param); });

} // namespace
} // namespace SsoClient
