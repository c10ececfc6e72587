// SPDX-License-Identifier: Apache-2.0
// The effect of OpenSSL's configuration on the library: none, unless the host requests it; then it can only add
// restrictions.
#include "integration/openssl_host/host_process.h"
#include "support/scripted_server.h"
#include "support/work_folder.h"

#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <string>
#include <vector>

#include <sys/stat.h>

namespace {

using Testing::HostProcess;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsSettings;
using Steps = std::vector<std::string>;

const std::string DONE = "handshake: \n";
const std::string CONFIGURED = "configuration: done\n";
const std::string REFUSED_BY_SERVER =
    "handshake: The TLS handshake with localhost failed: "
    "error:0A000410:SSL routines::sslv3 alert handshake failure (SSL alert number 40)\n";
const std::string UNSUPPORTED_PROTOCOL =
    "handshake: The TLS handshake with localhost failed: "
    "error:0A00042E:SSL routines::tlsv1 alert protocol version (SSL alert number 70)\n";

class Configuration : public testing::Test {
protected:
  /// A file with "system_default" settings for TLS.
  std::string TlsConfiguration(const std::string &settings) {
    return Write("openssl_conf = init\n[init]\nssl_conf = tls\n[tls]\nsystem_default = all\n[all]\n" + settings);
  }
  std::string Write(const std::string &text) { return m_folder.Write("openssl.cnf", text); }

  /// The output of a host, against a server with `settings`.
  std::string Run(const TlsSettings &settings, const Steps &steps, const std::string &configuration) {
    ScriptedServer server([](ServerConnection &connection) { connection.Handshake(); }, settings);
    return HostProcess(server.GetPort(), steps, configuration).Finish();
  }

  Testing::WorkFolder m_folder;
};

TlsSettings Tls12(const std::string &ciphers, const std::string &certificate = "localhost-rsa2048") {
  TlsSettings settings;
  settings.certificate = certificate;
  settings.maximumVersion = TLS1_2_VERSION;
  settings.allowsWeakness = true;
  settings.ciphers = ciphers;
  return settings;
}

TEST_F(Configuration, HasNoEffectWhenItIsWeak) {
  const std::string weak = TlsConfiguration("CipherString = ALL:eNULL:aNULL:@SECLEVEL=0\nMinProtocol = None\n"
                                            "SignatureAlgorithms = RSA+SHA1:ECDSA+SHA1:RSA+SHA256:ECDSA+SHA256\n"
                                            "Options = UnsafeLegacyServerConnect,UnsafeLegacyRenegotiation\n");
  for (const Steps &steps : {Steps{"handshake"}, Steps{"host-loads-configuration", "handshake"},
                             Steps{"use-system-configuration", "handshake"}}) {
    const std::string first = steps.front() == "use-system-configuration" ? CONFIGURED : "";
    SCOPED_TRACE(steps.front());
    EXPECT_EQ(Run(Tls12("eNULL:@SECLEVEL=0"), steps, weak), first + REFUSED_BY_SERVER) << "no encryption";
    EXPECT_EQ(Run(Tls12("aNULL:@SECLEVEL=0"), steps, weak), first + REFUSED_BY_SERVER) << "no certificate";
    EXPECT_EQ(Run(Tls12("kRSA:@SECLEVEL=0"), steps, weak), first + REFUSED_BY_SERVER) << "no forward secrecy";
    EXPECT_EQ(Run(Tls12("ECDHE+AESGCM:@SECLEVEL=0", "localhost-rsa1024"), steps, weak),
              first + "handshake: The TLS handshake with localhost failed: the server's certificate was not accepted: "
                      "EE certificate key too weak (certificate \"CN=localhost-rsa1024\")\n");
    EXPECT_EQ(Run(Tls12("ECDHE+AESGCM"), steps, weak), first + DONE);
    TlsSettings old = Tls12("ALL:@SECLEVEL=0");
    old.maximumVersion = TLS1_1_VERSION;
    EXPECT_EQ(Run(old, steps, weak), first + UNSUPPORTED_PROTOCOL);
  }
}

TEST_F(Configuration, AddsRestrictionsWhenTheHostRequestsIt) {
  const auto expect = [this](const std::string &settings, const TlsSettings &server, const std::string &refusal) {
    SCOPED_TRACE(settings);
    const std::string strict = TlsConfiguration(settings);
    EXPECT_EQ(Run(server, {"handshake"}, strict), DONE);
    EXPECT_EQ(Run(server, {"host-loads-configuration", "handshake"}, strict), DONE);
    EXPECT_EQ(Run(server, {"use-system-configuration", "handshake"}, strict), CONFIGURED + refusal);
  };
  expect("MinProtocol = TLSv1.3\n", Tls12("ECDHE+AESGCM"), UNSUPPORTED_PROTOCOL);
  expect("CipherString = ECDHE+CHACHA20\n", Tls12("ECDHE+AESGCM"), REFUSED_BY_SERVER);
  expect("CipherString = kRSA\n", Tls12("ECDHE+AESGCM:kRSA"), UNSUPPORTED_PROTOCOL); // no suite is allowed by both
  expect("CipherString = DEFAULT:@SECLEVEL=3\n", Tls12("ECDHE+AESGCM"),
         "handshake: The TLS handshake with localhost failed: the server's certificate was not accepted: "
         "EE certificate key too weak (certificate \"CN=localhost-rsa2048\")\n");
}

const std::string EVERYTHING = "verification: done\n"
                               "rsa2048.key: done\n"
                               "p256-encrypted.key: done\n"
                               "p256-traditional-encrypted.key: done\n"
                               "p256.key.der: done\n"
                               "URI: done\n"
                               "key store: done\n"
                               "client certificate: done\n" +
                               DONE;

TEST_F(Configuration, IsNotRead) {
  // Opening this file would block for ever.
  const std::string pipe = m_folder / "openssl.cnf";
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  EXPECT_EQ(Run(TlsSettings(), {"use-everything"}, pipe), EVERYTHING);
}

TEST_F(Configuration, HasNoEffectWhenItAllowsNoAlgorithm) {
  const std::string none = Write("openssl_conf = init\n[init]\nalg_section = algorithms\n"
                                 "[algorithms]\ndefault_properties = provider=nobody\n");
  EXPECT_EQ(Run(TlsSettings(), {"use-everything"}, none), EVERYTHING);
  EXPECT_EQ(Run(TlsSettings(), {"host-loads-configuration", "use-everything"}, none), EVERYTHING);
}

TEST_F(Configuration, LoadsItsProvidersWhenTheHostRequestsIt) {
  const std::string providers =
      Write("openssl_conf = init\n[init]\nproviders = all\n[all]\ndefault = on\nreporting = module\n"
            "[on]\nactivate = 1\n[module]\nactivate = 1\nmodule = " +
            std::string(Testing::ProviderPath()) + "\n");
  EXPECT_EQ(Run(TlsSettings(), {"use-everything"}, providers), EVERYTHING);
  EXPECT_EQ(Run(TlsSettings(), {"use-system-configuration", "use-everything"}, providers),
            "provider loaded\n" + CONFIGURED + EVERYTHING);
}

TEST_F(Configuration, CanBeRequestedAnyNumberOfTimesOnAnyThread) {
  EXPECT_EQ(Run(TlsSettings(), {"on-many-threads", "use-system-configuration", "handshake", "use-system-configuration"},
                TlsConfiguration("MinProtocol = TLSv1.2\n")),
            CONFIGURED + DONE + CONFIGURED);
}

TEST_F(Configuration, IsRefusedAfterTheFirstUse) {
  EXPECT_EQ(Run(TlsSettings(), {"handshake", "use-system-configuration", "handshake"}, ""),
            DONE +
                "configuration: InvalidStateException: The system's configuration of OpenSSL is asked for too late: "
                "OpenSSL is in use already\n" +
                DONE);
}

TEST_F(Configuration, IsReportedWhenOpenSslRefusesIt) {
  const std::string invalid = Write("config_diagnostics = 1\nopenssl_conf = init\n[init]\nnothing_of_the_kind = x\n");
  EXPECT_EQ(Run(TlsSettings(), {"handshake"}, invalid), DONE);
  const std::string output = Run(TlsSettings(), {"use-system-configuration"}, invalid);
  EXPECT_EQ(output.rfind("configuration: CryptoException: Cannot initialise OpenSSL: error:", 0), 0u) << output;
}

} // namespace
