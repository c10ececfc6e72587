// SPDX-License-Identifier: Apache-2.0
// The commands of docs/guide/hardware-keys.md, in their order, with an emulated TPM and the configuration of the page.
#include "software_tpm.h"

#include "support/data_file.h"
#include "support/dev_sts.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <vector>

namespace Testing {
namespace {

constexpr const char *ENVELOPE =
    "<s:Envelope xmlns:s='http://www.w3.org/2003/05/soap-envelope'><s:Body><read/></s:Body></s:Envelope>";

std::string ReadPage() {
  std::ifstream page(DataPath("../../docs/guide/hardware-keys.md"));
  return {std::istreambuf_iterator<char>(page), {}};
}

/// The lines of all blocks of this language.
std::vector<std::string> LinesOfBlocks(const std::string &page, const std::string &language) {
  std::vector<std::string> lines;
  bool isInside = false;
  std::istringstream text(page);
  for (std::string line; std::getline(text, line);) {
    if (line.rfind("```", 0) == 0) {
      isInside = line == "```" + language;
    } else if (isInside) {
      lines.push_back(line);
    }
  }
  return lines;
}

std::string Replace(std::string text, const std::string &from, const std::string &to) {
  for (std::size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size())) {
    text.replace(at, from.size(), to);
  }
  return text;
}

void CopyFile(const std::string &from, const std::string &to) {
  std::filesystem::copy_file(from, to, std::filesystem::copy_options::overwrite_existing);
}

TEST(PageOfHardwareKeys, HasCommandsThatWork) {
  if (!SoftwareTpm::FindMissing().empty()) {
    GTEST_SKIP() << SoftwareTpm::FindMissing();
  }
  const DevSts service;
  const SoftwareTpm tpm;
  const WorkFolder &folder = tpm.GetFolder();
  std::string configuration;
  for (const std::string &line : LinesOfBlocks(ReadPage(), "text")) {
    configuration += line + "\n";
  }
  folder.Write("openssl.cnf", configuration);
  folder.Write("envelope.xml", ENVELOPE);
  CopyFile(service.PathOf("authority.crt"), folder / "ca.pem");
  CopyFile(service.PathOf("signing.crt"), folder / "sts.pem");
  int commands = 0;
  for (std::string line : LinesOfBlocks(ReadPage(), "sh")) {
    line = Replace(line, "https://sts.corp.example/STS/trust", service.GetUrl());
    line = Replace(line, " ssoclient ", std::string(" ") + SoftwareTpm::GetTool() + " ");
    // Without a resource manager, nothing else removes the objects of the last command from the TPM.
    tpm.Run(line.rfind("tpm2_", 0) == 0 ? line + " && tpm2_flushcontext -t" : line);
    if (std::filesystem::exists(folder / "client.csr") && !std::filesystem::exists(folder / "client.pem")) {
      tpm.SignRequest("client.csr", service.PathOf("authority.crt"), service.PathOf("authority.key"));
    }
    ++commands;
  }
  EXPECT_EQ(commands, 8);
  EXPECT_NE(folder.Read("signed.xml").find("SignatureValue"), std::string::npos);
}

} // namespace
} // namespace Testing
