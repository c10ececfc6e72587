// SPDX-License-Identifier: Apache-2.0

#include "integration/gssapi/gss_acceptor.h"

#include "gss_name.h"
#include "gss_status.h"

#include <gssapi/gssapi_ext.h>

#include <array>
#include <stdexcept>

namespace Testing {

using SsoClient::Gssapi::DescribeStatus;
using SsoClient::Gssapi::GssOctets;
using SsoClient::Gssapi::GssStatus;
using SsoClient::Gssapi::NameHandle;
using SsoClient::Gssapi::SpnegoMechanism;

GssAcceptor::GssAcceptor(const std::string &keytab, const std::filesystem::path &folder) {
  const std::string replays = "file2:" + (folder / "replays").string();
  std::array<gss_key_value_element_desc, 2> elements = {{{"keytab", keytab.c_str()}, {"rcache", replays.c_str()}}};
  const gss_key_value_set_desc store = {elements.size(), elements.data()};
  gss_OID_set_desc mechanisms = {1, SpnegoMechanism()};
  GssStatus status;
  status.major = gss_acquire_cred_from(&status.minor, GSS_C_NO_NAME, GSS_C_INDEFINITE, &mechanisms, GSS_C_ACCEPT,
                                       &store, m_credential.Slot(), nullptr, nullptr);
  if (status.IsError()) {
    throw std::runtime_error("the acceptor has no credential: " + DescribeStatus(status, SpnegoMechanism()));
  }
}

std::vector<std::uint8_t> GssAcceptor::Accept(const std::vector<std::uint8_t> &leg) {
  std::vector<std::uint8_t> input = leg;
  gss_buffer_desc buffer = {input.size(), input.data()};
  NameHandle client;
  GssOctets answer;
  GssStatus status;
  m_delegated.Reset();
  status.major =
      gss_accept_sec_context(&status.minor, m_context.Slot(), m_credential.Get(), &buffer, GSS_C_NO_CHANNEL_BINDINGS,
                             client.Slot(), nullptr, answer.Slot(), nullptr, nullptr, m_delegated.Slot());
  if (status.IsError()) {
    m_failure = DescribeStatus(status, SpnegoMechanism());
  } else if ((status.major & GSS_S_CONTINUE_NEEDED) == 0) {
    m_isComplete = true;
    GssOctets name;
    gss_display_name(&status.minor, client.Get(), name.Slot(), nullptr);
    m_client.assign(name.begin(), name.end());
  }
  return {answer.begin(), answer.end()};
}

} // namespace Testing
