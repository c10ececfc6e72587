// SPDX-License-Identifier: Apache-2.0
// The tests' own key distribution centre ends with them, in whatever way they end.

#include "support/kerberos_realm.h"

#include <gtest/gtest.h>

#include <array>
#include <csignal>
#include <cstdlib>
#include <filesystem>

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Testing {
namespace {

TEST(KerberosRealm, LeavesNoProcessFileOrVariable) {
  pid_t centre = -1;
  std::filesystem::path folder;
  {
    const KerberosRealm realm;
    centre = realm.GetCentre();
    folder = realm.GetFolder();
    EXPECT_EQ(kill(centre, 0), 0);
    EXPECT_TRUE(std::filesystem::exists(folder));
    EXPECT_NE(std::getenv("KRB5_CONFIG"), nullptr);
  }
  EXPECT_EQ(kill(centre, 0), -1);
  EXPECT_FALSE(std::filesystem::exists(folder));
  EXPECT_EQ(std::getenv("KRB5_CONFIG"), nullptr);
}

/// What a process with a realm reports about it.
struct RealmFacts {
  pid_t centre = -1;
  std::array<char, 256> folder{};
};

/// Starts a process with a realm, and ends it with `signal` during its work.
RealmFacts EndProcessWithRealm(int signal) {
  std::array<int, 2> pipe{};
  EXPECT_EQ(::pipe(pipe.data()), 0);
  const pid_t child = fork();
  if (child == 0) {
    alarm(60); // threads of other tests may have held locks when the process was forked
    const KerberosRealm realm;
    RealmFacts facts;
    facts.centre = realm.GetCentre();
    realm.GetFolder().string().copy(facts.folder.data(), facts.folder.size() - 1);
    const bool isReported = write(pipe[1], &facts, sizeof facts) == sizeof facts;
    while (isReported) {
      pause();
    }
    _exit(1);
  }
  close(pipe[1]);
  RealmFacts facts;
  EXPECT_EQ(read(pipe[0], &facts, sizeof facts), ssize_t{sizeof facts});
  close(pipe[0]);
  EXPECT_EQ(kill(facts.centre, 0), 0);
  kill(child, signal);
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
  std::filesystem::remove_all(facts.folder.data()); // the killed process could not do this
  return facts;
}

TEST(KerberosRealm, EndsItsCentreWhenTheTestIsKilled) {
  ASSERT_EQ(prctl(PR_SET_CHILD_SUBREAPER, 1), 0); // so that this process can wait for the orphan's end
  for (const int signal : {SIGKILL, SIGABRT, SIGTERM}) {
    const RealmFacts facts = EndProcessWithRealm(signal);
    int status = 0;
    EXPECT_EQ(waitpid(facts.centre, &status, 0), facts.centre);
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) << status;
  }
  prctl(PR_SET_CHILD_SUBREAPER, 0);
}

} // namespace
} // namespace Testing
