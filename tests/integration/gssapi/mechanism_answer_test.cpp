// SPDX-License-Identifier: Apache-2.0
// Answers that the GSSAPI allows and Kerberos never gives: the linker redirects the handler's calls to this file.

#include "integration/gssapi/negotiation_fixture.h"
#include "support/throws_message.h"

#include <gssapi/gssapi.h>

#include <gtest/gtest.h>

namespace {

bool g_forgetsMutualAuthentication = false;
bool g_acceptsNoNames = false;

} // namespace

#define ARGUMENTS                                                                                                      \
  OM_uint32 *minor, gss_cred_id_t credential, gss_ctx_id_t *context, gss_name_t target, gss_OID mechanism,             \
      OM_uint32 wanted, OM_uint32 seconds, gss_channel_bindings_t bindings, gss_buffer_t input,                        \
      gss_OID *actualMechanism, gss_buffer_t output, OM_uint32 *flags, OM_uint32 *actualSeconds

extern "C" OM_uint32 RealInitContext(ARGUMENTS) asm("__real_gss_init_sec_context");
extern "C" OM_uint32 AlteredInitContext(ARGUMENTS) asm("__wrap_gss_init_sec_context");
extern "C" OM_uint32 AlteredInitContext(ARGUMENTS) {
  const OM_uint32 major = RealInitContext(minor, credential, context, target, mechanism, wanted, seconds, bindings,
                                          input, actualMechanism, output, flags, actualSeconds);
  if (g_forgetsMutualAuthentication) {
    *flags &= ~OM_uint32{GSS_C_MUTUAL_FLAG};
  }
  return major;
}

extern "C" OM_uint32 RealImportName(OM_uint32 *minor, gss_buffer_t text, gss_OID form,
                                    gss_name_t *name) asm("__real_gss_import_name");
extern "C" OM_uint32 AlteredImportName(OM_uint32 *minor, gss_buffer_t text, gss_OID form,
                                       gss_name_t *name) asm("__wrap_gss_import_name");
extern "C" OM_uint32 AlteredImportName(OM_uint32 *minor, gss_buffer_t text, gss_OID form, gss_name_t *name) {
  if (g_acceptsNoNames) {
    *minor = 0;
    return GSS_S_BAD_NAME;
  }
  return RealImportName(minor, text, form, name);
}

namespace SsoClient::Gssapi {
namespace {

TEST(Mechanism, ReportsARefusedNameAsAnInvalidArgument) {
  g_acceptsNoNames = true;
  EXPECT_THROWS_MESSAGE(CreateSpnegoHandler(Testing::SettingsFor()), Tarvel::InvalidArgumentException,
                        "Invalid argument : 'sts@localhost' is not a valid name: An invalid name was supplied");
  g_acceptsNoNames = false;
}

TEST(Mechanism, IsRefusedWithoutMutualAuthentication) {
  const Testing::RealmWithAlice world;
  world.LogIn();
  Testing::GssAcceptor service = world.MakeAcceptor();
  const auto handler = CreateSpnegoHandler(Testing::SettingsFor());
  const Testing::Bytes finalLeg = service.Accept(*handler->NegotiateLeg({}));
  g_forgetsMutualAuthentication = true;
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg(finalLeg), GssNegotiationException,
                        "The service sts@localhost was not authenticated: the mechanism does not support it");
  g_forgetsMutualAuthentication = false;
  EXPECT_FALSE(handler->IsMutuallyAuthenticated());
}

} // namespace
} // namespace SsoClient::Gssapi
