// SPDX-License-Identifier: Apache-2.0
// Token sources with a cache file over the network: what the service sees when several programs share a file, and when the
// file is damaged or refused.

#include "integration/client/fault_service.h"
#include "support/forked.h"
#include "support/identity.h"
#include "support/process_resources.h"
#include "support/sanitized.h"
#include "support/work_folder.h"

#include <ssoclient/client/token_source.h>

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include <sys/stat.h>
#include <unistd.h>

namespace SsoClient {
namespace {

using namespace Testing;

/// A source that shares the file. Each program makes such a source.
std::unique_ptr<TokenSource> MakeSource(const FaultService &service, const std::string &path) {
  TokenSourceOptions options;
  options.cache = TokenCacheOptions{path, "alice@corp.example"};
  options.firstBackOff = std::chrono::milliseconds(1);
  options.longestBackOff = std::chrono::milliseconds(1);
  return std::make_unique<TokenSource>(service.CreateClient(), AnyCredential, AnySpec(), options);
}

class SharedCache : public testing::Test {
protected:
  std::string GetToken() const {
    const auto source = MakeSource(m_service, m_path);
    return OutcomeOf([&source] { return source->Get(); });
  }

  const WorkFolder m_folder;
  const std::string m_path = m_folder / "token";
  FaultService m_service{Reply(TokenResponse()), false};
};

TEST_F(SharedCache, IsFilledByOneRequestOfEightProcessesThatStartAtOnce) {
  if (IS_SANITIZED) {
    GTEST_SKIP() << "The sanitizers do not support threads that a child of a process with threads starts.";
  }
  constexpr int PROCESSES = 8;
  const Shared<std::atomic<bool>> isOpen;
  std::vector<pid_t> children;
  for (int i = 0; i < PROCESSES; ++i) {
    children.push_back(StartChild([&] {
      while (!*isOpen) {
        ::usleep(100);
      }
      EXPECT_EQ(GetToken(), "token");
    }));
  }
  *isOpen = true;
  for (const pid_t child : children) {
    EXPECT_EQ(WaitForChild(child), "");
  }
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 1);
}

TEST_F(SharedCache, ServesLaterProgramsWithoutARequest) {
  EXPECT_EQ(GetToken(), "token");
  EXPECT_EQ(GetToken(), "token");
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 1);
  EXPECT_EQ(m_folder.Names(), std::set<std::string>{"token"});
}

TEST_F(SharedCache, DoesNotServeAClientWithAnotherIdentityInTheNameOfTheSameUser) {
  EXPECT_EQ(GetToken(), "token");
  SecurityTokenServiceConfig config = m_service.GetConfig();
  config.holderOfKeyConfig = HolderIdentity();
  TokenSourceOptions options;
  options.cache = TokenCacheOptions{m_path, "alice@corp.example"};
  const TokenSource source(std::make_shared<TokenClient>(config), AnyCredential, AnySpec(), options);
  EXPECT_EQ(OutcomeOf([&source] { return source.Get(); }), "token");
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 2);
}

TEST_F(SharedCache, ThatIsDamagedIsReplacedAfterOneRequest) {
  ASSERT_EQ(GetToken(), "token");
  const std::string whole = m_folder.Read("token");
  int requests = 1;
  for (const std::string &content :
       {std::string(), whole.substr(0, whole.size() / 2), std::string("ssoclient token cache 2\n"),
        std::string(whole).replace(whole.find("alice@"), 6, "admin@")}) {
    m_folder.Write("token", content);
    EXPECT_EQ(GetToken(), "token") << content;
    EXPECT_EQ(m_service.GetServer().GetConnectionCount(), ++requests) << content;
    EXPECT_EQ(m_folder.Read("token"), whole);
  }
}

TEST_F(SharedCache, ThatIsRefusedEndsTheCallWithoutARequest) {
  m_folder.Write("token", "");
  ASSERT_EQ(::chmod(m_path.c_str(), 0644), 0);
  const auto source = MakeSource(m_service, m_path);
  const auto outcome = [&source] { return OutcomeOf([&source] { return source->Get(); }); };
  EXPECT_EQ(outcome(),
            "IOException: Cannot use " + m_path + ": its mode lets other users read or write it; it must be 0600");
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 0);

  ASSERT_EQ(::unlink(m_path.c_str()), 0);
  ASSERT_EQ(::symlink("elsewhere", m_path.c_str()), 0);
  EXPECT_TRUE(Eventually([&] { return outcome() == "IOException: Cannot use " + m_path + ": it is a symbolic link"; }));
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 0);

  ASSERT_EQ(::unlink(m_path.c_str()), 0);
  m_folder.Write("token", "foreign\n");
  ASSERT_EQ(::chmod(m_path.c_str(), 0600), 0);
  EXPECT_TRUE(
      Eventually([&] { return outcome() == "IOException: Cannot use " + m_path + ": it is not a token cache"; }));
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 0);
  EXPECT_EQ(m_folder.Read("token"), "foreign\n");

  ASSERT_EQ(::unlink(m_path.c_str()), 0);
  EXPECT_TRUE(Eventually([&] { return outcome() == "token"; }));
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 1);
}

} // namespace
} // namespace SsoClient
