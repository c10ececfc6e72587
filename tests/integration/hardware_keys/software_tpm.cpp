// SPDX-License-Identifier: Apache-2.0

#include "software_tpm.h"

#include <array>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <stdexcept>

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Testing {
namespace {

// The provider is next to OpenSSL's legacy one.
constexpr const char *CONFIGURATION = "openssl_conf = init\n"
                                      "config_diagnostics = 1\n"
                                      "[init]\n"
                                      "providers = provider_list\n"
                                      "[provider_list]\n"
                                      "default = default_provider\n"
                                      "tpm2 = tpm2_provider\n"
                                      "[default_provider]\n"
                                      "activate = 1\n"
                                      "[tpm2_provider]\n"
                                      "activate = 1\n";

constexpr const char *EXTENSIONS = "basicConstraints = critical, CA:false\n"
                                   "keyUsage = critical, digitalSignature\n"
                                   "extendedKeyUsage = clientAuth\n";

bool HasProvider() {
  for (const char *folder : {"/usr/lib/x86_64-linux-gnu", "/usr/lib/aarch64-linux-gnu", "/usr/lib64", "/usr/lib"}) {
    if (std::filesystem::exists(std::string(folder) + "/ossl-modules/tpm2.so")) {
      return true;
    }
  }
  return false;
}

bool HasProgram(const std::string &name) {
  return std::filesystem::exists("/usr/bin/" + name) || std::filesystem::exists("/usr/local/bin/" + name);
}

} // namespace

std::string SoftwareTpm::FindMissing() {
  std::string missing;
  const auto require = [&missing](bool isThere, const char *package) {
    if (!isThere) {
      missing += std::string(missing.empty() ? "not installed: " : ", ") + package;
    }
  };
  require(HasProgram("swtpm"), "swtpm");
  require(HasProgram("tpm2_createprimary"), "tpm2-tools");
  require(HasProgram("openssl"), "openssl");
  require(HasProvider(), "tpm2-openssl");
  return missing;
}

SoftwareTpm::SoftwareTpm() {
  m_folder.Write("openssl.cnf", CONFIGURATION);
  m_folder.Write("client.ext", EXTENSIONS);
  Start();
  try {
    Run("tpm2_createprimary -Q -C o -G ecc -c primary.ctx && tpm2_flushcontext -t");
  } catch (...) {
    kill(m_process, SIGKILL);
    waitpid(m_process, nullptr, 0);
    throw;
  }
}

SoftwareTpm::~SoftwareTpm() {
  kill(m_process, SIGKILL);
  waitpid(m_process, nullptr, 0);
}

std::string SoftwareTpm::MakeKey(const std::string &algorithm) {
  constexpr const char *ATTRIBUTES = "'fixedtpm|fixedparent|sensitivedataorigin|userwithauth|sign'";
  const std::string handle = "0x8100000" + std::to_string(++m_keys);
  Run("tpm2_create -Q -C primary.ctx -G " + algorithm + " -a " + ATTRIBUTES + " -u key.pub -r key.priv && " +
      "tpm2_flushcontext -t && tpm2_load -Q -C primary.ctx -u key.pub -r key.priv -c key.ctx && tpm2_flushcontext -t "
      "&& " +
      "tpm2_evictcontrol -Q -C o -c key.ctx " + handle + " && tpm2_flushcontext -t");
  return "handle:" + handle;
}

std::string SoftwareTpm::MakeKeyFile() {
  Run("openssl genpkey -propquery '?provider=tpm2' -algorithm RSA -pkeyopt bits:2048 -out key.pem");
  return m_folder / "key.pem";
}

std::string SoftwareTpm::IssueCertificate(const std::string &keyUri, const std::string &authority,
                                          const std::string &authorityKey) {
  Run("openssl req -new -propquery '?provider=tpm2' -subj /O=corp.example/CN=client -key " + keyUri +
      " -out request.pem");
  return SignRequest("request.pem", authority, authorityKey);
}

std::string SoftwareTpm::SignRequest(const std::string &request, const std::string &authority,
                                     const std::string &authorityKey) const {
  Run("OPENSSL_CONF=/dev/null openssl x509 -req -in " + request + " -CA '" + authority + "' -CAkey '" + authorityKey +
      "' -set_serial 1 -days 30 -extfile client.ext -out client.pem");
  return m_folder / "client.pem";
}

const char *SoftwareTpm::GetTool() noexcept {
  return SSOCLIENT_TOOL;
}

void SoftwareTpm::SetEnvironment() const {
  setenv("OPENSSL_CONF", (m_folder / "openssl.cnf").c_str(), 1);
  setenv("TPM2OPENSSL_TCTI", ("swtpm:path=" + (m_folder / "tpm")).c_str(), 1);
}

std::string SoftwareTpm::GetEnvironment() const {
  return "OPENSSL_CONF='" + (m_folder / "openssl.cnf") + "' TPM2OPENSSL_TCTI='swtpm:path=" + (m_folder / "tpm") + "' ";
}

std::string SoftwareTpm::Run(const std::string &command) const {
  const std::string environment = GetEnvironment() + "TPM2TOOLS_TCTI='swtpm:path=" + (m_folder / "tpm") + "'";
  const std::string line = "cd '" + m_folder.Path() + "' && export " + environment + " && { " + command + "; } 2>&1";
  FILE *const pipe = popen(line.c_str(), "re");
  std::string output;
  std::array<char, 4096> buffer{};
  while (pipe && std::fgets(buffer.data(), static_cast<int>(buffer.size()), pipe)) {
    output += buffer.data();
  }
  if (!pipe || pclose(pipe) != 0) {
    throw std::runtime_error(command + " failed: " + output);
  }
  return output;
}

void SoftwareTpm::Start() {
  std::filesystem::create_directory(m_folder / "state");
  const std::string socket = m_folder / "tpm";
  const std::string state = "dir=" + (m_folder / "state");
  const std::string server = "type=unixio,path=" + socket;
  const std::string control = "type=unixio,path=" + socket + ".ctrl";
  const std::string log = "file=" + (m_folder / "swtpm.log");
  const std::string identifier = "file=" + (m_folder / "swtpm.pid");
  const pid_t parent = getpid();
  m_process = fork();
  if (m_process == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() == parent) { // otherwise the parent has ended already, and no signal would arrive
      execlp("swtpm", "swtpm", "socket", "--tpm2", "--tpmstate", state.c_str(), "--server", server.c_str(), "--ctrl",
             control.c_str(), "--flags", "not-need-init,startup-clear", "--log", log.c_str(), "--pid",
             identifier.c_str(), nullptr);
    }
    _exit(127);
  }
  AwaitReady();
}

// The TPM has opened its sockets before it writes its process identifier.
void SoftwareTpm::AwaitReady() const {
  constexpr int PATIENCE = 30000;
  for (int turn = 0; !std::filesystem::exists(m_folder / "swtpm.pid"); ++turn) {
    if (m_process < 0 || turn == PATIENCE || waitpid(m_process, nullptr, WNOHANG) != 0) {
      throw std::runtime_error("swtpm does not start: " + m_folder.Read("swtpm.log"));
    }
    usleep(1000);
  }
}

} // namespace Testing
