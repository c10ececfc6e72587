// SPDX-License-Identifier: Apache-2.0
/// @file
/// The whole public interface of the client in one header. The GSSAPI handler, which is a library of its own, is not part of it.

#pragma once

#include <ssoclient/advice.h>
#include <ssoclient/as_future.h>
#include <ssoclient/client/awaitable.h>
#include <ssoclient/client/call_options.h>
#include <ssoclient/client/cancellation.h>
#include <ssoclient/client/credential.h>
#include <ssoclient/client/exceptions.h>
#include <ssoclient/client/executor.h>
#include <ssoclient/client/outcome.h>
#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>
#include <ssoclient/connection_spec.h>
#include <ssoclient/create_saml_token.h>
#include <ssoclient/delegate.h>
#include <ssoclient/descriptions.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/export.h>
#include <ssoclient/gss_negotiation_context.h>
#include <ssoclient/holder_of_key_config.h>
#include <ssoclient/logger.h>
#include <ssoclient/negotiation_handler.h>
#include <ssoclient/operation_observer.h>
#include <ssoclient/principal_id.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/service_dialect.h>
#include <ssoclient/service_options.h>
#include <ssoclient/token_details.h>
#include <ssoclient/token_report.h>
#include <ssoclient/token_spec.h>
#include <ssoclient/token_verifier.h>
#include <ssoclient/verify_options.h>
#include <ssoclient/version.h>
