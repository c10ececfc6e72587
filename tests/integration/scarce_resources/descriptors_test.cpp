// SPDX-License-Identifier: Apache-2.0
// No descriptor left. Each death test runs in its own process, and begins with the first use of the network there.
#include "outcome.h"

#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/sanitized.h"
#include "support/soap_responses.h"
#include "system/name_lookup.h"

#include <tarvel/system/stream.h>

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <iostream>
#include <netdb.h>
#include <optional>
#include <string>
#include <sys/resource.h>
#include <unistd.h>
#include <vector>

namespace {

/// How the resolver fails, and the errno that it leaves.
struct ResolverFailure {
  int code;
  int error;
};

std::optional<ResolverFailure> g_resolverFailure;

} // namespace

// The linker calls this in place of the C library's function.
int RealResolve(const char *name, const char *service, const addrinfo *hints,
                addrinfo **list) asm("__real_getaddrinfo");
int Resolve(const char *name, const char *service, const addrinfo *hints, addrinfo **list) asm("__wrap_getaddrinfo");
int Resolve(const char *name, const char *service, const addrinfo *hints, addrinfo **list) {
  if (g_resolverFailure) {
    errno = g_resolverFailure->error;
    return g_resolverFailure->code;
  }
  return RealResolve(name, service, hints, list);
}

namespace Testing {
namespace {

/// During its lifetime, only `spare` descriptors of the process are free.
class UsedUpDescriptors {
public:
  explicit UsedUpDescriptors(int spare) {
    ::getrlimit(RLIMIT_NOFILE, &m_earlier);
    if (spare == 0) { // with this limit, a descriptor that another thread closes cannot be used again either
      SetLimit(STDERR_FILENO + 1);
      return;
    }
    SetLimit(256);
    for (int one = ::open("/dev/null", O_RDONLY); one >= 0; one = ::open("/dev/null", O_RDONLY)) {
      m_descriptors.push_back(one);
    }
    for (int i = 0; i < spare; ++i) {
      ::close(m_descriptors.back());
      m_descriptors.pop_back();
    }
  }
  UsedUpDescriptors(const UsedUpDescriptors &) = delete;
  UsedUpDescriptors &operator=(const UsedUpDescriptors &) = delete;
  ~UsedUpDescriptors() {
    for (const int one : m_descriptors) {
      ::close(one);
    }
    ::setrlimit(RLIMIT_NOFILE, &m_earlier);
  }

private:
  void SetLimit(rlim_t descriptors) const {
    const rlimit limit{descriptors, m_earlier.rlim_max};
    ::setrlimit(RLIMIT_NOFILE, &limit);
  }

  rlimit m_earlier{};
  std::vector<int> m_descriptors;
};

PostingServer AnsweringServer() {
  return PostingServer(std::vector<std::string>(10, IssueResponse(ReadDataFile("tokens/bearer.xml"))));
}

void Report(const ServicePtr &service) {
  std::cerr << Acquire(service) << "\n" << AcquireAsynchronously(service) << "\n";
}

[[noreturn]] void ReportFirstUse(int spare) {
  const PostingServer server = AnsweringServer();
  const ServicePtr service = ServiceAt(server.GetUrl());
  {
    const UsedUpDescriptors used(spare);
    Report(service);
  }
  Report(service);
  std::_Exit(0);
}

TEST(NoDescriptorDeathTest, FailsTheFirstUseOfTheNetworkButNoLaterOne) {
  if (IS_SANITIZED) {
    GTEST_SKIP() << "UndefinedBehaviorSanitizer opens descriptors to check the type of an object";
  }
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  const std::string expected = "Tarvel::InvalidStateException: Cannot wait for the network: Too many open files\n"
                               "Tarvel::InvalidStateException: Cannot wait for the network: Too many open files\n"
                               "{Name: alice; Domain:corp.example}\n"
                               "{Name: alice; Domain:corp.example}\n";
  for (const int spare : {0, 1}) {
    EXPECT_EXIT(ReportFirstUse(spare), testing::ExitedWithCode(0), testing::Eq(expected)) << spare;
  }
}

[[noreturn]] void ReportLaterUse() {
  const PostingServer server = AnsweringServer();
  const ServicePtr service = ServiceAt(server.GetUrl());
  const ServicePtr address = ServiceAt("http://127.0.0.1:80/");
  const ServicePtr knownName = ServiceAt("http://localhost:80/");
  const ServicePtr unknownName = ServiceAt("http://no-such-host.invalid:80/");
  Report(service);
  {
    const UsedUpDescriptors used(0);
    Report(address);
    Report(knownName);
    Report(unknownName);
  }
  Report(service);
  std::_Exit(0);
}

TEST(NoDescriptorDeathTest, IsTheReasonThatALaterUseReports) {
  if (IS_SANITIZED) {
    GTEST_SKIP() << "UndefinedBehaviorSanitizer opens descriptors to check the type of an object";
  }
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  const std::string alice = "{Name: alice; Domain:corp.example}\n";
  std::string expected = alice + alice;
  for (const std::string host : {"127.0.0.1", "localhost", "no-such-host.invalid"}) {
    for (int i = 0; i < 2; ++i) {
      expected += "SsoClient::CommunicationException: Cannot connect to " + host + ":80: Too many open files\n";
    }
  }
  EXPECT_EXIT(ReportLaterUse(), testing::ExitedWithCode(0), testing::Eq(expected + alice + alice));
}

/// The reason that a look-up reports when the resolver fails.
std::string LookUp(const ResolverFailure &failure) {
  g_resolverFailure = failure;
  std::string reason = "(found)";
  try {
    Tarvel::System::LookUpName("sts.example");
  } catch (const Tarvel::System::NetworkException &exception) {
    reason = exception.what();
  }
  g_resolverFailure.reset();
  return reason;
}

TEST(LookUpName, ReportsTheResolversReason) {
  EXPECT_EQ(LookUp({EAI_NONAME, ENOENT}), "Name or service not known");
  EXPECT_EQ(LookUp({EAI_AGAIN, 0}), "Temporary failure in name resolution");
  EXPECT_EQ(LookUp({EAI_SYSTEM, EIO}), "Input/output error");
}

TEST(LookUpName, ReportsALackOfDescriptorsThatIsOnlyInErrno) {
  EXPECT_EQ(LookUp({EAI_NONAME, EMFILE}), "Too many open files");
  EXPECT_EQ(LookUp({EAI_AGAIN, ENFILE}), "Too many open files in system");
}

TEST(LookUpName, ReportsALackOfDescriptorsThatIsNotEvenInErrno) {
  const UsedUpDescriptors used(0);
  EXPECT_EQ(LookUp({EAI_NONAME, 0}), "Too many open files");
  EXPECT_EQ(LookUp({EAI_AGAIN, ENOENT}), "Too many open files");
}

} // namespace
} // namespace Testing
