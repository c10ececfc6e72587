// SPDX-License-Identifier: Apache-2.0

#include "terminal_style.h"

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

class StyleOfDescriptor : public testing::Test {
protected:
  const PseudoTerminal m_terminal;
  const PlainFile m_file;

private:
  const ScopedVariable m_colour{"NO_COLOR", nullptr};
  const ScopedVariable m_kind{"TERM", "xterm"};
  const ScopedVariable m_columns{"COLUMNS", nullptr};
};

TEST_F(StyleOfDescriptor, HasColoursOnlyForATerminal) {
  EXPECT_TRUE(StyleOf(m_terminal.Get()).hasColours);
  EXPECT_FALSE(StyleOf(m_file.Get()).hasColours);
  EXPECT_FALSE(StyleOf(-1).hasColours);
}

TEST_F(StyleOfDescriptor, RespectsNoColorUnlessItIsEmpty) {
  {
    const ScopedVariable colour("NO_COLOR", "0");
    EXPECT_FALSE(StyleOf(m_terminal.Get()).hasColours);
  }
  const ScopedVariable colour("NO_COLOR", "");
  EXPECT_TRUE(StyleOf(m_terminal.Get()).hasColours);
}

TEST_F(StyleOfDescriptor, HasNoColoursForATerminalWithoutColour) {
  const ScopedVariable kind("TERM", "dumb");
  EXPECT_FALSE(StyleOf(m_terminal.Get()).hasColours);
}

TEST_F(StyleOfDescriptor, HasTheWidthOfTheTerminal) {
  EXPECT_EQ(132u, StyleOf(m_terminal.Get()).width);
}

TEST_F(StyleOfDescriptor, HasTheDefaultWidthWhenItIsNotKnown) {
  m_terminal.SetColumns(0);
  EXPECT_EQ(100u, StyleOf(m_terminal.Get()).width);
  EXPECT_EQ(100u, StyleOf(m_file.Get()).width);
}

TEST_F(StyleOfDescriptor, PrefersTheWidthInTheVariableColumns) {
  const ScopedVariable columns("COLUMNS", "77");
  EXPECT_EQ(77u, StyleOf(m_terminal.Get()).width);
  EXPECT_EQ(77u, StyleOf(m_file.Get()).width);
}

} // namespace
} // namespace SsoClient::Tool
