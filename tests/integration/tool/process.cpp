// SPDX-License-Identifier: Apache-2.0

#include "process.h"

#include "built_files.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string_view>

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

namespace ToolTest {
namespace {

class Pipe {
public:
  Pipe() {
    std::array<int, 2> ends{};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
      throw std::runtime_error("pipe");
    }
    readEnd = ends[0];
    writeEnd = ends[1];
  }
  Pipe(const Pipe &) = delete;
  Pipe &operator=(const Pipe &) = delete;
  ~Pipe() {
    CloseRead();
    CloseWrite();
  }
  void CloseRead() { Close(readEnd); }
  void CloseWrite() { Close(writeEnd); }

  int readEnd;
  int writeEnd;

private:
  static void Close(int &end) {
    if (end >= 0) {
      close(end);
      end = -1;
    }
  }
};

struct Process {
  Pipe in, out, err;
  pid_t id = -1;
};

void Start(Process &process, std::vector<std::string> arguments, const std::string &folder) {
  std::vector<char *> raw;
  for (std::string &argument : arguments) {
    raw.push_back(argument.data());
  }
  raw.push_back(nullptr);
  process.id = fork();
  if (process.id == 0) {
    dup2(process.in.readEnd, STDIN_FILENO);
    dup2(process.out.writeEnd, STDOUT_FILENO);
    dup2(process.err.writeEnd, STDERR_FILENO);
    ResetSignals();
    if (chdir(folder.c_str()) == 0) {
      execv(raw[0], raw.data());
    }
    _exit(126);
  }
  process.in.CloseRead();
  process.out.CloseWrite();
  process.err.CloseWrite();
}

void Feed(Pipe &pipe, std::string_view &input) {
  const ssize_t count = write(pipe.writeEnd, input.data(), input.size());
  input.remove_prefix(count > 0 ? static_cast<std::size_t>(count) : 0);
  if (input.empty() || (count < 0 && errno != EAGAIN)) {
    pipe.CloseWrite();
  }
}

void Drain(Pipe &pipe, std::string &text) {
  std::array<char, 65536> buffer;
  const ssize_t count = read(pipe.readEnd, buffer.data(), buffer.size());
  if (count <= 0) {
    pipe.CloseRead();
    return;
  }
  text.append(buffer.data(), static_cast<std::size_t>(count));
}

/// What happens to the standard input of a process when all input is written.
enum class Input { ENDS, STAYS_OPEN };

/// Writes `input` and reads both outputs at the same time, so that neither side blocks the other.
void Exchange(Process &process, std::string_view input, Result &result, Input atEnd = Input::ENDS) {
  std::signal(SIGPIPE, SIG_IGN);
  fcntl(process.in.writeEnd, F_SETFL, O_NONBLOCK);
  if (input.empty() && atEnd == Input::ENDS) {
    process.in.CloseWrite();
  }
  while (process.out.readEnd >= 0 || process.err.readEnd >= 0) {
    std::array<pollfd, 3> polled{{{input.empty() ? -1 : process.in.writeEnd, POLLOUT, 0},
                                  {process.out.readEnd, POLLIN, 0},
                                  {process.err.readEnd, POLLIN, 0}}};
    poll(polled.data(), polled.size(), -1);
    if (polled[0].revents) {
      Feed(process.in, input);
    }
    if (polled[1].revents) {
      Drain(process.out, result.out);
    }
    if (polled[2].revents) {
      Drain(process.err, result.err);
    }
  }
}

void Finish(const Process &process, Result &result) {
  int status = 0;
  waitpid(process.id, &status, 0);
  result.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

} // namespace

bool Blocks(pid_t id, int signal) {
  std::ifstream status("/proc/" + std::to_string(id) + "/status");
  for (std::string word; status >> word;) {
    if (word == "SigBlk:") {
      std::uint64_t mask = 0;
      status >> std::hex >> mask;
      return ((mask >> (signal - 1)) & 1u) != 0;
    }
  }
  return false;
}

void ResetSignals() {
  for (const int signal : {SIGINT, SIGQUIT, SIGPIPE, SIGHUP, SIGTERM}) {
    std::signal(signal, SIG_DFL);
  }
}

std::vector<std::string> ToolCommand(const std::vector<std::string> &arguments) {
  std::vector<std::string> all = {ToolPath()};
  all.insert(all.end(), arguments.begin(), arguments.end());
  return all;
}

std::vector<std::string> ShellCommand(const std::string &commandLine) {
  const std::string toolFolder = std::filesystem::path(ToolPath()).parent_path();
  return {"/bin/sh", "-c", "PATH='" + toolFolder + "':\"$PATH\"; " + commandLine};
}

Result RunTool(const std::vector<std::string> &arguments, const std::string &input) {
  Process process;
  Result result;
  Start(process, ToolCommand(arguments), Testing::DataPath("tokens"));
  Exchange(process, input, result);
  Finish(process, result);
  return result;
}

Result RunShell(const std::string &commandLine, const std::string &folder) {
  Process process;
  Result result;
  Start(process, ShellCommand(commandLine), folder);
  Exchange(process, {}, result);
  Finish(process, result);
  return result;
}

Result RunToolAndSignal(const std::vector<std::string> &arguments, int signal) {
  Process process;
  Result result;
  Start(process, ToolCommand(arguments), Testing::DataPath("tokens"));
  // No event reports that a process has begun to wait for a signal, so this reads the state of the process repeatedly.
  while (!Blocks(process.id, signal)) {
    if (waitpid(process.id, nullptr, WNOHANG) != 0) {
      throw std::runtime_error("the tool ended before it waited for the signal");
    }
    usleep(1000);
  }
  kill(process.id, signal);
  Exchange(process, {}, result, Input::STAYS_OPEN);
  Finish(process, result);
  return result;
}

} // namespace ToolTest
