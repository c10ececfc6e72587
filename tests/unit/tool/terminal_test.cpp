// SPDX-License-Identifier: Apache-2.0

#include "terminal.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <fcntl.h>
#include <stdexcept>
#include <string>

#include <sys/ioctl.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

/// A new pseudo-terminal of 132 columns.
class PseudoTerminal {
public:
  PseudoTerminal() : m_master(posix_openpt(O_RDWR | O_NOCTTY)) {
    if (m_master < 0 || grantpt(m_master) != 0 || unlockpt(m_master) != 0) {
      throw std::runtime_error("no pseudo-terminal");
    }
    m_slave = open(ptsname(m_master), O_RDWR | O_NOCTTY | O_CLOEXEC);
    SetColumns(132);
  }
  PseudoTerminal(const PseudoTerminal &) = delete;
  PseudoTerminal &operator=(const PseudoTerminal &) = delete;
  ~PseudoTerminal() {
    close(m_slave);
    close(m_master);
  }

  void SetColumns(unsigned short columns) const {
    winsize size = {};
    size.ws_col = columns;
    ioctl(m_slave, TIOCSWINSZ, &size);
  }
  int Get() const { return m_slave; }

private:
  int m_master;
  int m_slave = -1;
};

/// A descriptor that is not a terminal.
class PlainFile {
public:
  PlainFile() : m_descriptor(open("/dev/null", O_RDWR | O_CLOEXEC)) {}
  PlainFile(const PlainFile &) = delete;
  PlainFile &operator=(const PlainFile &) = delete;
  ~PlainFile() { close(m_descriptor); }
  int Get() const { return m_descriptor; }

private:
  int m_descriptor;
};

/// Sets or, for null, removes a variable of the environment, and restores it at the end.
class ScopedVariable {
public:
  ScopedVariable(const char *name, const char *value) : m_name(name) {
    const char *const earlier = std::getenv(name);
    m_wasSet = earlier != nullptr;
    m_earlier = m_wasSet ? earlier : "";
    Set(value);
  }
  ScopedVariable(const ScopedVariable &) = delete;
  ScopedVariable &operator=(const ScopedVariable &) = delete;
  ~ScopedVariable() { Set(m_wasSet ? m_earlier.c_str() : nullptr); }

private:
  void Set(const char *value) const {
    if (value) {
      setenv(m_name, value, 1);
    } else {
      unsetenv(m_name);
    }
  }

  const char *m_name;
  bool m_wasSet = false;
  std::string m_earlier;
};

TEST(UsesColour, IsTrueOnlyForATerminal) {
  const ScopedVariable colour("NO_COLOR", nullptr);
  const ScopedVariable kind("TERM", "xterm");
  EXPECT_TRUE(UsesColour(PseudoTerminal().Get()));
  EXPECT_FALSE(UsesColour(PlainFile().Get()));
  EXPECT_FALSE(UsesColour(-1));
}

TEST(UsesColour, RespectsNoColorUnlessItIsEmpty) {
  const PseudoTerminal terminal;
  const ScopedVariable kind("TERM", "xterm");
  {
    const ScopedVariable colour("NO_COLOR", "0");
    EXPECT_FALSE(UsesColour(terminal.Get()));
  }
  const ScopedVariable colour("NO_COLOR", "");
  EXPECT_TRUE(UsesColour(terminal.Get()));
}

TEST(UsesColour, IsFalseForATerminalWithoutColour) {
  const PseudoTerminal terminal;
  const ScopedVariable colour("NO_COLOR", nullptr);
  const ScopedVariable kind("TERM", "dumb");
  EXPECT_FALSE(UsesColour(terminal.Get()));
}

TEST(Coloured, PutsTheTextBetweenTheColourAndItsEnd) {
  EXPECT_EQ("\x1b[32mfine\x1b[0m", Coloured("fine", Colour::GREEN, true));
  EXPECT_EQ("\x1b[33mwarning\x1b[0m", Coloured("warning", Colour::YELLOW, true));
  EXPECT_EQ("\x1b[31mfailed\x1b[0m", Coloured("failed", Colour::RED, true));
  EXPECT_EQ("\x1b[1mTLS\x1b[0m", Coloured("TLS", Colour::BOLD, true));
}

TEST(Coloured, LeavesTheTextUnchangedWithoutColour) {
  EXPECT_EQ("fine", Coloured("fine", Colour::GREEN, false));
  EXPECT_EQ("fine", Coloured("fine", Colour::NONE, true));
}

TEST(GetWidth, IsTheNumberOfColumnsOfTheTerminal) {
  const PseudoTerminal terminal;
  EXPECT_EQ(132u, GetWidth(terminal.Get()));
}

TEST(GetWidth, IsTheDefaultWhenItIsNotKnown) {
  const PseudoTerminal terminal;
  terminal.SetColumns(0);
  EXPECT_EQ(80u, GetWidth(terminal.Get()));
  EXPECT_EQ(80u, GetWidth(PlainFile().Get()));
}

} // namespace
} // namespace SsoClient::Tool
