// SPDX-License-Identifier: Apache-2.0

#include "support/kerberos_realm.h"

#include "support/loopback_socket.h"

#include <algorithm>
#include <array>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <stdexcept>
#include <system_error>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Testing {
namespace {

/// How many ports are tried, because another process may use the port over UDP.
constexpr int PORT_TRIALS = 5;

/// The clock skew that Kerberos tolerates by default, and the one that a client needs to get a ticket from a centre
/// with a wrong clock.
constexpr int USUAL_CLOCK_SKEW_SEC = 300;
constexpr int ANY_CLOCK_SKEW_SEC = 1000000;

/// Returns a socket that is bound to a free port of 127.0.0.1, and sets `port` to that port. While the socket is open, no
/// program is given this port by chance; a centre, which asks for it and can share it, may use it.
int ReservePort(int &port) {
  const int descriptor = BindLoopback(false, port);
  const int on = 1;
  if (setsockopt(descriptor, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on) != 0) {
    close(descriptor);
    throw std::system_error(errno, std::generic_category(), "SO_REUSEADDR");
  }
  return descriptor;
}

/// Also searches the folders of daemons, which are not in every user's search path.
std::string FindProgram(const std::string &name) {
  for (const char *folder : {"/usr/sbin/", "/usr/bin/", "/usr/local/sbin/", "/usr/local/bin/"}) {
    if (access((folder + name).c_str(), X_OK) == 0) {
      return folder + name;
    }
  }
  throw std::runtime_error(name + " is not installed");
}

/// A program's arguments and environment.
struct Command {
  std::vector<std::string> arguments; ///< the program's path first
  std::vector<std::string> environment;
};

struct Child {
  pid_t id = -1;
  int output = -1; ///< where to read its standard output and error
};

std::vector<char *> ToPointers(std::vector<std::string> &texts) {
  std::vector<char *> pointers(texts.size());
  std::transform(texts.begin(), texts.end(), pointers.begin(), [](std::string &text) { return text.data(); });
  pointers.push_back(nullptr);
  return pointers;
}

/// Starts a program that does not outlive this process.
Child Start(Command command) {
  const std::vector<char *> arguments = ToPointers(command.arguments);
  const std::vector<char *> environment = ToPointers(command.environment);
  std::array<int, 2> pipe{};
  if (pipe2(pipe.data(), O_CLOEXEC) != 0) {
    throw std::system_error(errno, std::generic_category(), "pipe2");
  }
  const pid_t parent = getpid();
  const pid_t id = fork();
  if (id == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() == parent) { // otherwise the parent has ended already, and no signal would arrive
      dup2(open("/dev/null", O_RDONLY), STDIN_FILENO);
      dup2(pipe[1], STDOUT_FILENO);
      dup2(pipe[1], STDERR_FILENO);
      execve(arguments[0], arguments.data(), environment.data());
    }
    _exit(127);
  }
  close(pipe[1]);
  return {id, pipe[0]};
}

/// Reads until `text` has arrived, or to the end when `text` is empty.
std::string ReadUntil(int descriptor, const std::string &text) {
  std::string all;
  std::array<char, 4096> buffer{};
  while (text.empty() || all.find(text) == std::string::npos) {
    const ssize_t count = read(descriptor, buffer.data(), buffer.size());
    if (count <= 0) {
      break;
    }
    all.append(buffer.data(), static_cast<std::size_t>(count));
  }
  return all;
}

} // namespace

KerberosRealm::KerberosRealm(const RealmSettings &settings) : m_settings(settings) {
  std::string folder = std::filesystem::temp_directory_path() / "kerberos-realm-XXXXXX";
  if (mkdtemp(folder.data()) == nullptr) {
    throw std::system_error(errno, std::generic_category(), folder);
  }
  m_folder = folder;
  try {
    StartCentreOnSomePort();
  } catch (...) {
    Clean();
    throw;
  }
  for (const char *variable : {"KRB5CCNAME", "KRB5_KTNAME", "KRB5_CLIENT_KTNAME", "KRB5RCACHENAME", "KRB5_TRACE"}) {
    unsetenv(variable);
  }
  setenv("KRB5_CONFIG", (m_folder / "krb5.conf").c_str(), 1);
}

KerberosRealm::~KerberosRealm() {
  unsetenv("KRB5_CONFIG");
  Clean();
}

std::string KerberosRealm::AddPrincipal(const std::string &principal) const {
  std::string file = principal + ".keytab";
  std::replace(file.begin(), file.end(), '/', '_');
  Run("kadmin.local", {"addprinc", "-randkey", principal});
  Run("kadmin.local", {"ktadd", "-norandkey", "-k", NameFile(file), principal});
  return NameFile(file);
}

void KerberosRealm::ChangeKey(const std::string &principal) const {
  Run("kadmin.local", {"change_password", "-randkey", principal});
}

void KerberosRealm::GetTicket(const std::string &principal, const std::string &keytab, const std::string &cache) const {
  // Requests a longer lifetime than the centre allows, so that the centre's limit decides.
  Run("kinit", {"-k", "-t", keytab, "-c", cache, "-l", "1d", principal}, "any_clock.conf");
}

void KerberosRealm::Stop() noexcept {
  if (m_centre > 0) {
    kill(m_centre, SIGKILL);
    waitpid(m_centre, nullptr, 0);
    close(m_centreOutput);
    m_centre = -1;
  }
}

void KerberosRealm::WriteConfiguration(const std::string &file, int clockSkewSec) const {
  std::ofstream(m_folder / file) << "[libdefaults]\n"
                                 << "  default_realm = " << m_settings.name << "\n"
                                 << "  dns_lookup_kdc = false\n"
                                 << "  dns_lookup_realm = false\n"
                                 << "  dns_canonicalize_hostname = false\n"
                                 << "  rdns = false\n"
                                 << "  udp_preference_limit = 1\n"
                                 << "  clockskew = " << clockSkewSec << "\n"
                                 << "  kdc_timesync = " << (m_settings.adoptsClock ? 1 : 0) << "\n"
                                 << "  default_ccache_name = " << GetDefaultCache() << "\n"
                                 << "  default_keytab_name = " << NameFile("none.keytab") << "\n"
                                 << "  default_client_keytab_name = " << NameFile("none.keytab") << "\n"
                                 << "[realms]\n"
                                 << "  " << m_settings.name << " = {\n"
                                 << "    kdc = 127.0.0.1:" << m_port << "\n"
                                 << "  }\n"
                                 << "[domain_realm]\n"
                                 << "  localhost = " << m_settings.name << "\n";
}

void KerberosRealm::WriteCentreProfile() const {
  const std::string log = NameFile("kdc.log");
  std::ofstream(m_folder / "kdc.conf") << "[kdcdefaults]\n"
                                       << "  kdc_listen = 127.0.0.1:" << m_port << "\n"
                                       << "  kdc_tcp_listen = 127.0.0.1:" << m_port << "\n"
                                       << "[realms]\n"
                                       << "  " << m_settings.name << " = {\n"
                                       << "    database_name = " << (m_folder / "principals").string() << "\n"
                                       << "    key_stash_file = " << (m_folder / "stash").string() << "\n"
                                       << "    acl_file = " << (m_folder / "acl").string() << "\n"
                                       << "    max_life = 1h\n"
                                       << "  }\n"
                                       << "[logging]\n"
                                       << "  kdc = " << log << "\n"
                                       << "  admin_server = " << log << "\n"
                                       << "  default = " << log << "\n";
}

void KerberosRealm::Run(const std::string &program, const std::vector<std::string> &arguments,
                        const std::string &configuration) const {
  Command command{{FindProgram(program)}, MakeEnvironment(configuration)};
  command.arguments.insert(command.arguments.end(), arguments.begin(), arguments.end());
  const Child child = Start(command);
  const std::string output = ReadUntil(child.output, "");
  close(child.output);
  int status = 0;
  waitpid(child.id, &status, 0);
  if (status != 0) {
    throw std::runtime_error(program + " failed: " + output);
  }
}

std::vector<std::string> KerberosRealm::MakeEnvironment(const std::string &configuration) const {
  return {"KRB5_CONFIG=" + (m_folder / configuration).string(), "KRB5_KDC_PROFILE=" + (m_folder / "kdc.conf").string(),
          "LC_ALL=C"};
}

void KerberosRealm::StartCentreOnSomePort() {
  for (int trial = 1; m_centre < 0; ++trial) {
    ClosePort();
    m_reservedPort = ReservePort(m_port);
    WriteConfiguration("krb5.conf", USUAL_CLOCK_SKEW_SEC);
    WriteConfiguration("any_clock.conf", ANY_CLOCK_SKEW_SEC);
    WriteCentreProfile();
    if (trial == 1) {
      Run("kdb5_util", {"create", "-s", "-P", "master", "-r", m_settings.name});
    }
    const std::string output = StartCentre();
    if (m_centre < 0 && trial == PORT_TRIALS) {
      throw std::runtime_error("the key distribution centre does not start: " + output);
    }
  }
}

std::string KerberosRealm::StartCentre() {
  const Child child = Start(
      {{FindProgram("krb5kdc"), "-n", "-T", std::to_string(m_settings.clockOffsetSec)}, MakeEnvironment("krb5.conf")});
  m_centre = child.id;
  m_centreOutput = child.output;
  std::string output = ReadUntil(child.output, "starting...");
  if (output.find("starting...") == std::string::npos) {
    Stop();
  }
  return output;
}

void KerberosRealm::ClosePort() noexcept {
  if (m_reservedPort >= 0) {
    close(m_reservedPort);
    m_reservedPort = -1;
  }
}

void KerberosRealm::Clean() noexcept {
  Stop();
  ClosePort();
  std::error_code ignored;
  std::filesystem::remove_all(m_folder, ignored);
}

} // namespace Testing
