// SPDX-License-Identifier: Apache-2.0

#include "support/dev_sts.h"

#include "support/json_object.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <utility>

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

extern char **environ; // NOLINT(readability-redundant-declaration): not declared in strict C++

namespace Testing {

namespace {

constexpr std::chrono::seconds READY_LIMIT(120); // six RSA keys under a sanitizer, on a busy machine
constexpr int END_MILLISECONDS = 60000;

void Require(bool condition, const std::string &what) {
  if (!condition) {
    throw std::runtime_error("development service: " + what);
  }
}

void CloseDescriptor(int &descriptor) noexcept {
  if (descriptor >= 0) {
    ::close(descriptor);
    descriptor = -1;
  }
}

int ExitCodeOf(int status) noexcept {
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

/// Both ends of a pipe; an end that is not released is closed.
struct Pipe {
  Pipe() { Require(::pipe2(ends.data(), O_CLOEXEC) == 0, "no pipe"); }
  Pipe(const Pipe &) = delete;
  Pipe &operator=(const Pipe &) = delete;
  ~Pipe() {
    CloseDescriptor(ends[0]);
    CloseDescriptor(ends[1]);
  }
  int Take(std::size_t end) { return std::exchange(ends.at(end), -1); }

  std::array<int, 2> ends{-1, -1};
};

} // namespace

DevSts::DevSts(const std::vector<std::string> &arguments) {
  try {
    Start(arguments);
    ReadReadyLine();
  } catch (...) {
    Stop();
    Close();
    throw;
  }
}

DevSts::~DevSts() {
  const int exitCode = Stop();
  if (exitCode != 0) {
    // A destructor, which may run after the last test, has no other way to fail the program.
    std::fprintf(stderr, "The development service has ended with %d\n%s", exitCode, GetLog().c_str());
    std::fflush(nullptr);
    std::_Exit(EXIT_FAILURE);
  }
  Close();
}

void DevSts::Start(const std::vector<std::string> &arguments) {
  Require(*GetProgram() != '\0', "not built, because libxmlsec1 is missing");
  std::vector<std::string> line = {GetProgram(), "--until-eof"};
  if (std::find(arguments.begin(), arguments.end(), "--state") == arguments.end()) {
    line.insert(line.end(), {"--state", GetUsualState()});
  }
  line.insert(line.end(), arguments.begin(), arguments.end());
  std::vector<char *> raw;
  for (std::string &word : line) {
    raw.push_back(word.data());
  }
  raw.push_back(nullptr);

  Pipe in;
  Pipe out;
  m_log = ::memfd_create("log", MFD_CLOEXEC);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, in.ends[0], STDIN_FILENO);
  posix_spawn_file_actions_adddup2(&actions, out.ends[1], STDOUT_FILENO);
  posix_spawn_file_actions_adddup2(&actions, m_log, STDERR_FILENO);
  const int error = ::posix_spawn(&m_process, GetProgram(), &actions, nullptr, raw.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  if (error != 0) {
    m_process = -1;
  }
  Require(error == 0, "cannot be started");
  m_in = in.Take(1);
  m_out = out.Take(0);
}

void DevSts::ReadReadyLine() {
  const auto limit = std::chrono::steady_clock::now() + READY_LIMIT;
  while (m_readyLine.find('\n') == std::string::npos) {
    const auto left =
        std::chrono::duration_cast<std::chrono::milliseconds>(limit - std::chrono::steady_clock::now()).count();
    pollfd output{m_out, POLLIN, 0};
    Require(left > 0 && ::poll(&output, 1, static_cast<int>(left)) >= 0, "not ready in time: " + GetLog());
    std::array<char, 4096> buffer;
    const ssize_t count = output.revents == 0 ? -1 : ::read(m_out, buffer.data(), buffer.size());
    if (count == 0) {
      const int exitCode = Stop();
      Require(false, "ended with " + std::to_string(exitCode) + ": " + GetLog());
    }
    m_readyLine.append(buffer.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
  }
  m_rest = m_readyLine.substr(m_readyLine.find('\n') + 1);
  m_readyLine.resize(m_readyLine.find('\n'));
  const JsonObject ready = ReadJsonObject(m_readyLine);
  m_url = ready.texts.at("url");
  m_port = static_cast<int>(ready.numbers.at("port"));
  m_thumbprint = ready.texts.at("thumbprint");
  m_folder = std::filesystem::path(ready.texts.at("ca")).parent_path();
}

std::string DevSts::ReadStateFile(std::string_view file) const {
  std::ifstream stream(PathOf(file), std::ios::binary);
  Require(stream.good(), "no file " + PathOf(file));
  return {std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>()};
}

std::string DevSts::GetLog() const {
  std::string log;
  std::array<char, 4096> buffer;
  ssize_t count = 0;
  while ((count = ::pread(m_log, buffer.data(), buffer.size(), static_cast<off_t>(log.size()))) > 0) {
    log.append(buffer.data(), static_cast<std::size_t>(count));
  }
  return log;
}

ProcessEnd DevSts::End(int signal) {
  if (signal != 0) {
    ::kill(m_process, signal);
  } else {
    CloseDescriptor(m_in);
  }
  ProcessEnd end;
  end.out = m_rest;
  std::array<char, 4096> buffer;
  ssize_t count = 0;
  while ((count = ::read(m_out, buffer.data(), buffer.size())) > 0) {
    end.out.append(buffer.data(), static_cast<std::size_t>(count));
  }
  int status = 0;
  Require(AwaitEnd(END_MILLISECONDS, status), "does not end");
  end.exitCode = ExitCodeOf(status);
  return end;
}

bool DevSts::AwaitEnd(int milliseconds, int &status) noexcept {
  int descriptor = static_cast<int>(::syscall(SYS_pidfd_open, m_process, 0));
  pollfd process{descriptor, POLLIN, 0};
  const bool ended = ::poll(&process, 1, milliseconds) > 0 && ::waitpid(m_process, &status, WNOHANG) == m_process;
  CloseDescriptor(descriptor);
  if (ended) {
    m_process = -1;
  }
  return ended;
}

int DevSts::Stop() noexcept {
  CloseDescriptor(m_in);
  int status = 0;
  if (m_process > 0 && !AwaitEnd(END_MILLISECONDS, status)) {
    ::kill(m_process, SIGKILL);
    ::waitpid(m_process, &status, 0);
  }
  return ExitCodeOf(status);
}

void DevSts::Close() noexcept {
  CloseDescriptor(m_out);
  CloseDescriptor(m_log);
}

} // namespace Testing
