// SPDX-License-Identifier: Apache-2.0

#include "gss_acceptor.h"

#include "refusal.h"

#include <gssapi/gssapi.h>
#include <gssapi/gssapi_ext.h>

#include <array>
#include <filesystem>
#include <stdexcept>
#include <utility>

namespace DevSts {

namespace {

/// A status has only a few texts.
constexpr int MAX_TEXTS = 16;

gss_OID Spnego() noexcept {
  static char octets[] = "\x2b\x06\x01\x05\x05\x02"; // 1.3.6.1.5.5.2, RFC 4178
  static gss_OID_desc description = {sizeof octets - 1, octets};
  return &description;
}

gss_OID Kerberos() noexcept {
  static char octets[] = "\x2a\x86\x48\x86\xf7\x12\x01\x02\x02"; // 1.2.840.113554.1.2.2, RFC 1964
  static gss_OID_desc description = {sizeof octets - 1, octets};
  return &description;
}

/// Octets that the GSSAPI has allocated.
class Octets {
public:
  Octets() = default;
  Octets(const Octets &) = delete;
  Octets &operator=(const Octets &) = delete;
  ~Octets() {
    OM_uint32 minor = 0;
    gss_release_buffer(&minor, &m_buffer);
  }
  gss_buffer_t Slot() noexcept { return &m_buffer; }
  std::string Text() const { return {static_cast<const char *>(m_buffer.value), m_buffer.length}; }
  std::vector<unsigned char> Bytes() const {
    const auto *const begin = static_cast<const unsigned char *>(m_buffer.value);
    return m_buffer.length == 0 ? std::vector<unsigned char>()
                                : std::vector<unsigned char>(begin, begin + m_buffer.length);
  }

private:
  gss_buffer_desc m_buffer = {0, nullptr};
};

std::string TextsOf(OM_uint32 code, int kind) {
  std::string all;
  OM_uint32 rest = 0;
  for (int i = 0; i == 0 || (rest != 0 && i < MAX_TEXTS); ++i) {
    Octets text;
    OM_uint32 minor = 0;
    if (GSS_ERROR(gss_display_status(&minor, code, kind, Spnego(), &rest, text.Slot())) != 0) {
      break;
    }
    const std::string words = text.Text();
    all += (all.empty() ? "" : "; ") + words.substr(0, words.find('\0')); // some texts end with a null
  }
  return all;
}

std::string Describe(OM_uint32 major, OM_uint32 minor) {
  const std::string words = TextsOf(minor, GSS_C_MECH_CODE);
  return TextsOf(major, GSS_C_GSS_CODE) + (minor == 0 ? "" : ": " + words);
}

/// Shared by all negotiations.
class Credential {
public:
  Credential(const std::filesystem::path &keytab, const std::filesystem::path &replays) {
    const std::string keytabName = "FILE:" + keytab.string();
    const std::string replayCache = "file2:" + replays.string();
    std::array<gss_key_value_element_desc, 2> elements = {
        {{"keytab", keytabName.c_str()}, {"rcache", replayCache.c_str()}}};
    const gss_key_value_set_desc store = {elements.size(), elements.data()};
    gss_OID_set_desc mechanisms = {1, Kerberos()};
    // First for Kerberos, because SPNEGO does not report why a keytab cannot be used.
    Acquire(store, mechanisms);
    Release();
    mechanisms.elements = Spnego();
    Acquire(store, mechanisms);
    mechanisms.elements = Kerberos();
    OM_uint32 minor = 0;
    gss_set_neg_mechs(&minor, m_credential, &mechanisms);
  }
  Credential(const Credential &) = delete;
  Credential &operator=(const Credential &) = delete;
  ~Credential() { Release(); }

  gss_cred_id_t Get() const noexcept { return m_credential; }

private:
  void Acquire(const gss_key_value_set_desc &store, gss_OID_set_desc &mechanisms) {
    OM_uint32 minor = 0;
    const OM_uint32 major = gss_acquire_cred_from(&minor, GSS_C_NO_NAME, GSS_C_INDEFINITE, &mechanisms, GSS_C_ACCEPT,
                                                  &store, &m_credential, nullptr, nullptr);
    if (GSS_ERROR(major) != 0) {
      throw std::runtime_error("--keytab: " + Describe(major, minor));
    }
  }
  void Release() noexcept {
    OM_uint32 minor = 0;
    gss_release_cred(&minor, &m_credential);
  }

  gss_cred_id_t m_credential = GSS_C_NO_CREDENTIAL;
};

class GssAcceptance final : public Acceptance {
public:
  explicit GssAcceptance(std::shared_ptr<const Credential> credential) : m_credential(std::move(credential)) {}
  ~GssAcceptance() override {
    OM_uint32 minor = 0;
    gss_delete_sec_context(&minor, &m_context, GSS_C_NO_BUFFER);
  }

  AcceptedLeg Accept(const std::vector<unsigned char> &leg) override {
    std::vector<unsigned char> input = leg; // a copy, because the GSSAPI's declarations do not use const
    gss_buffer_desc buffer = {input.size(), input.data()};
    Octets answer;
    OM_uint32 minor = 0;
    const OM_uint32 major =
        gss_accept_sec_context(&minor, &m_context, m_credential->Get(), &buffer, GSS_C_NO_CHANNEL_BINDINGS, nullptr,
                               nullptr, answer.Slot(), nullptr, nullptr, nullptr);
    if (GSS_ERROR(major) != 0) {
      throw Refusal(Code::FAILED_AUTHENTICATION, Describe(major, minor));
    }
    AcceptedLeg accepted;
    accepted.answer = answer.Bytes();
    if ((major & GSS_S_CONTINUE_NEEDED) == 0) {
      accepted.client = ClientName();
    }
    return accepted;
  }

private:
  std::string ClientName() const {
    gss_name_t name = GSS_C_NO_NAME;
    Octets text;
    OM_uint32 minor = 0;
    OM_uint32 major =
        gss_inquire_context(&minor, m_context, &name, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr);
    if (GSS_ERROR(major) == 0) {
      major = gss_display_name(&minor, name, text.Slot(), nullptr);
    }
    OM_uint32 ignored = 0;
    gss_release_name(&ignored, &name);
    if (GSS_ERROR(major) != 0) {
      throw Refusal(Code::FAILED_AUTHENTICATION, Describe(major, minor));
    }
    return text.Text();
  }

  const std::shared_ptr<const Credential> m_credential;
  gss_ctx_id_t m_context = GSS_C_NO_CONTEXT;
};

class SystemGssAcceptor final : public GssAcceptor {
public:
  SystemGssAcceptor(const std::filesystem::path &keytab, const std::filesystem::path &replays)
      : m_credential(std::make_shared<const Credential>(keytab, replays)) {}

  std::unique_ptr<Acceptance> Begin() const override { return std::make_unique<GssAcceptance>(m_credential); }

private:
  const std::shared_ptr<const Credential> m_credential;
};

} // namespace

std::unique_ptr<const GssAcceptor> CreateGssAcceptor(const std::filesystem::path &keytab,
                                                     const std::filesystem::path &replays) {
  return std::make_unique<const SystemGssAcceptor>(keytab, replays);
}

} // namespace DevSts
