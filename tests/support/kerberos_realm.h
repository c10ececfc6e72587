// SPDX-License-Identifier: Apache-2.0
/// @file
/// `KerberosRealm`, a realm for one test: MIT's key distribution centre on loopback, with its own folder and port.

#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include <sys/types.h>

namespace Testing {

struct RealmSettings {
  std::string name = "EXAMPLE.TEST";
  /// The centre's clock minus the machine's clock, in seconds.
  int clockOffsetSec = 0;
  /// Whether clients adopt the centre's clock, as they do by default.
  bool adoptsClock = true;
};

/// Needs no root privileges and does not change the machine's configuration: as long as it exists, KRB5_CONFIG of this
/// process is the realm's configuration, and the other variables of Kerberos are unset. So it must be made before the
/// test starts threads, and only one may exist at a time. The centre ends with this object, and also when this
/// process is killed.
///
/// Principals are given without their realm. Files of the realm's folder are given in Kerberos's form, "FILE:…".
class KerberosRealm {
public:
  /// @throws std::runtime_error with the output of the program that failed
  explicit KerberosRealm(const RealmSettings &settings = {});
  KerberosRealm(const KerberosRealm &) = delete;
  KerberosRealm &operator=(const KerberosRealm &) = delete;
  ~KerberosRealm();

  /// Registers a principal with a random key, and puts that key into a new keytab.
  /// @return the keytab's name
  std::string AddPrincipal(const std::string &principal) const;

  /// Gives a principal a new key, which is in no keytab.
  void ChangeKey(const std::string &principal) const;

  /// Gets a ticket into `cache`, also from a centre whose clock is wrong. It is valid for an hour by the centre's
  /// clock.
  void GetTicket(const std::string &principal, const std::string &keytab, const std::string &cache) const;

  /// Ends the centre, so that its port does not answer any more.
  void Stop() noexcept;

  /// The cache that a client uses by default. It does not exist until a ticket is put into it.
  std::string GetDefaultCache() const { return NameFile("default_cache"); }
  std::string NameFile(const std::string &name) const { return "FILE:" + (m_folder / name).string(); }
  pid_t GetCentre() const noexcept { return m_centre; }
  const std::filesystem::path &GetFolder() const noexcept { return m_folder; }

private:
  void WriteConfiguration(const std::string &file, int clockSkewSec) const;
  void WriteCentreProfile() const;
  void Run(const std::string &program, const std::vector<std::string> &arguments,
           const std::string &configuration = "krb5.conf") const;
  std::vector<std::string> MakeEnvironment(const std::string &configuration) const;
  void StartCentreOnSomePort();
  std::string StartCentre(); // returns its output
  void ClosePort() noexcept;
  void Clean() noexcept;

  const RealmSettings m_settings;
  std::filesystem::path m_folder;
  int m_port = 0;
  int m_reservedPort = -1; // a socket that reserves the port
  pid_t m_centre = -1;
  int m_centreOutput = -1; // kept open as long as the centre may write to it
};

} // namespace Testing
