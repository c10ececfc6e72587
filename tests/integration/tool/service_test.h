// SPDX-License-Identifier: Apache-2.0
/// @file
/// Runs the tool with a running development service.

#pragma once

#include "process.h"

#include "support/dev_sts.h"
#include "support/work_folder.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

#include <unistd.h>

namespace ToolTest {

using Testing::WorkFolder;

/// Each test has the service, and a folder with ca.pem (the server's authority), sts.pem (the token signer), the
/// identities client and other-client as NAME.pem and NAME.key, and password.txt and wrong.txt.
class ServiceTest : public testing::Test {
protected:
  /// @param arguments for the service
  explicit ServiceTest(const std::vector<std::string> &arguments = {}) : m_service(arguments) {
    const auto copy = [&](const char *from, const char *to) {
      std::filesystem::copy_file(m_service.PathOf(from), m_folder / to);
    };
    copy("authority.crt", "ca.pem");
    copy("signing.crt", "sts.pem");
    for (const std::string name : {"client", "other-client"}) {
      copy((name + ".crt").c_str(), (name + ".pem").c_str());
      copy((name + ".key").c_str(), (name + ".key").c_str());
    }
    m_folder.Write("password.txt", "wonderland\n");
    m_folder.Write("wrong.txt", "looking-glass\n");
  }

  /// The options for the service, or for one of its faults.
  std::string Service(const std::string &fault = {}) const {
    const std::string url = fault.empty() ? m_service.GetUrl() : m_service.FaultUrl(fault);
    return "--sts " + url + " --ca ca.pem --trust sts.pem ";
  }

  /// Runs a shell's command line in the folder.
  Result Run(const std::string &commandLine) const { return RunShell(commandLine, m_folder.Path()); }

  /// Runs the tool to acquire a token and write it to `file`. @throws std::runtime_error when that fails.
  void Acquire(const std::string &file, const std::string &options) const {
    const Result result = Run("ssoclient acquire " + Service() + options + " --out " + file);
    if (result.exitCode != 0) {
      throw std::runtime_error(result.err);
    }
  }

  /// Waits until the service has logged `text`.
  void AwaitLog(const std::string &text) const {
    constexpr int PATIENCE = 30000;
    for (int turn = 0; m_service.GetLog().find(text) == std::string::npos; ++turn) {
      if (turn == PATIENCE) {
        throw std::runtime_error("the service does not log '" + text + "' but '" + m_service.GetLog() + "'");
      }
      usleep(1000);
    }
  }

  const Testing::DevSts m_service;
  const WorkFolder m_folder;
};

constexpr const char *PASSWORD = "--user alice@corp.example --password-file password.txt ";
constexpr const char *IDENTITY = "--cert client.pem --key client.key ";
constexpr const char *OTHER_IDENTITY = "--cert other-client.pem --key other-client.key ";

} // namespace ToolTest
