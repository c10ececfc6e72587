// SPDX-License-Identifier: Apache-2.0
/// @file
/// `KerberosRealm`, a realm of our own: MIT's key distribution centre on loopback, in a folder and on a port of its own.

#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include <sys/types.h>

namespace Testing {

struct RealmSettings {
  std::string name = "EXAMPLE.TEST";
  /// How far the centre's clock goes ahead of the machine's, in seconds; negative for behind.
  int clockOffsetSec = 0;
  /// Whether clients adopt the centre's clock, as they do by default.
  bool adoptsClock = true;
};

/// Needs no root and touches nothing of the machine's configuration: as long as it lives, KRB5_CONFIG of this process
/// names the realm's configuration, and the other variables of Kerberos are unset. So it is made before the test starts
/// threads, and there is one at a time. The centre ends with this object, and with this process however that ends.
///
/// Principals are named without their realm, files of the realm's folder as Kerberos does it: "FILE:…".
class KerberosRealm {
public:
  /// @throws std::runtime_error with the output of what failed
  explicit KerberosRealm(const RealmSettings &settings = {});
  KerberosRealm(const KerberosRealm &) = delete;
  KerberosRealm &operator=(const KerberosRealm &) = delete;
  ~KerberosRealm();

  /// Registers a principal with a random key, and puts that key into a keytab of its own.
  /// @return the keytab's name
  std::string AddPrincipal(const std::string &principal) const;

  /// Gives a principal another key, which no keytab has.
  void ChangeKey(const std::string &principal) const;

  /// Gets a ticket into `cache`, also from a centre whose clock is wrong. It is good for an hour by the centre's clock.
  void GetTicket(const std::string &principal, const std::string &keytab, const std::string &cache) const;

  /// Ends the centre, so that nobody answers on its port.
  void Stop() noexcept;

  /// What a client uses that names no cache. There is none until somebody gets a ticket into it.
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
  std::string StartCentre(); // returns what it has printed
  void Clean() noexcept;

  const RealmSettings m_settings;
  std::filesystem::path m_folder;
  int m_port = 0;
  pid_t m_centre = -1;
  int m_centreOutput = -1; // kept open as long as the centre may write to it
};

} // namespace Testing
