// SPDX-License-Identifier: Apache-2.0

#include "integration/openssl_host/host_process.h"

#include <array>
#include <cstdlib>
#include <stdexcept>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Testing {

const char *ProviderPath() noexcept {
  return OPENSSL_HOST_PROVIDER;
}

HostProcess::HostProcess(int port, const std::vector<std::string> &steps, const std::string &configuration) {
  std::array<int, 2> input{};
  std::array<int, 2> output{};
  if (pipe2(input.data(), O_CLOEXEC) != 0 || pipe2(output.data(), O_CLOEXEC) != 0) {
    throw std::runtime_error("no pipe");
  }
  std::vector<std::string> words = {OPENSSL_HOST_PROGRAM, std::to_string(port)};
  words.insert(words.end(), steps.begin(), steps.end());
  std::vector<char *> arguments;
  for (std::string &word : words) {
    arguments.push_back(word.data());
  }
  arguments.push_back(nullptr);
  std::string variable = "OPENSSL_CONF=" + configuration;
  std::array<char *, 2> environment = {configuration.empty() ? nullptr : variable.data(), nullptr};
  m_process = fork();
  if (m_process == 0) {
    dup2(input[0], STDIN_FILENO);
    dup2(output[1], STDOUT_FILENO);
    execve(arguments[0], arguments.data(), environment.data());
    _exit(126);
  }
  close(input[0]);
  close(output[1]);
  m_input = input[1];
  m_output = output[0];
}

HostProcess::~HostProcess() {
  const std::lock_guard<std::mutex> lock(m_mutex);
  close(m_input);
  close(m_output);
  if (m_process > 0) {
    waitpid(m_process, nullptr, 0);
  }
}

void HostProcess::Continue() noexcept {
  const std::lock_guard<std::mutex> lock(m_mutex);
  [[maybe_unused]] const ssize_t written = write(m_input, "x", 1);
}

std::string HostProcess::Finish() {
  std::string text;
  std::array<char, 4096> buffer{};
  for (ssize_t count = 0; (count = read(m_output, buffer.data(), buffer.size())) > 0;) {
    text.append(buffer.data(), static_cast<std::size_t>(count));
  }
  int status = 0;
  waitpid(m_process, &status, 0);
  m_process = -1;
  if (WIFSIGNALED(status)) {
    text += "ended by signal " + std::to_string(WTERMSIG(status)) + "\n";
  } else if (WEXITSTATUS(status) != 0) {
    text += "exit code " + std::to_string(WEXITSTATUS(status)) + "\n";
  }
  return text;
}

} // namespace Testing
