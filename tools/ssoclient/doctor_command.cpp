// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient doctor`: finds out why a service cannot be used, without sending it any credential.

#include "command.h"
#include "connection.h"
#include "doctor_certificates.h"
#include "doctor_exchange.h"
#include "doctor_network.h"
#include "doctor_tls.h"
#include "interruption.h"
#include "option.h"
#include "step_limit.h"
#include "terminal_style.h"

#include <tarvel/http/url.h>
#include <tarvel/ssl/server_probe.h>

#include <boost/optional.hpp>

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <unistd.h>

namespace SsoClient::Tool {
namespace {

struct DoctorOptions {
  ConnectionOptions connection;
  std::vector<std::string> trustFiles;
};

/// How long a step that begins now may take.
std::int64_t StepMicroseconds() {
  const auto deadline = GetCallOptions().deadline;
  const auto left = deadline ? *deadline - CallOptions::Clock::now() : CallOptions::Clock::duration::zero();
  return StepLimit(GetTimeLimit(), std::chrono::duration_cast<std::chrono::microseconds>(left)).count();
}

DoctorTarget TargetOf(const std::string &url) {
  DoctorTarget target;
  Tarvel::Http::ParseHttpURL(url, target.isSecure, target.host, target.port, target.path);
  return target;
}

std::vector<CertificateFile> LoadFiles(const DoctorOptions &options) {
  std::vector<CertificateFile> files;
  for (const std::string &path : options.trustFiles) {
    files.push_back({path, false, Tarvel::Crypto::LoadCertificates(path)});
  }
  if (!options.connection.caFile.empty()) {
    files.push_back({options.connection.caFile, true, Tarvel::Crypto::LoadCertificates(options.connection.caFile)});
  }
  return files;
}

std::vector<DoctorCheck> Examine(const DoctorOptions &options, const std::vector<CertificateFile> &files) {
  const DoctorTarget target = TargetOf(options.connection.url);
  const auto context = CreateContext(options.connection);
  const std::string &thumbprint = options.connection.thumbprint;
  const auto probe = Tarvel::Ssl::ProbeServer(target.host, target.port, context, thumbprint, StepMicroseconds());
  const Tarvel::System::DateTime now = Tarvel::System::GetUtcDateTime();

  boost::optional<DoctorExchange> exchange;
  if (MaySend(target, probe)) {
    exchange = Exchange(target, context, thumbprint, StepMicroseconds());
  }
  const bool hasAnswer = exchange && exchange->failure.empty() && exchange->hasBody;
  return {CheckAddress(target, probe),
          CheckTcp(target, probe),
          CheckTls(target, probe, !thumbprint.empty(), now),
          CheckHttp(exchange.get_ptr(),
                    probe.handshake ? "TLS has failed, so nothing was sent." : "There is no connection."),
          CheckClock(exchange.get_ptr()),
          CheckTrust(hasAnswer ? &exchange->answer : nullptr),
          CheckCertificates(files, probe, now)};
}

ExitCode Diagnose(const DoctorOptions &options, const OutputOptions &output) {
  if (output.format == Format::XML) {
    throw UsageException("a diagnosis has no XML form; give --format text or json");
  }
  CheckConnection(options.connection);
  const std::vector<DoctorCheck> checks = Examine(options, LoadFiles(options));
  WriteOutput(output.format == Format::JSON ? RenderChecksJson(checks) : RenderChecks(checks, StyleOf(STDOUT_FILENO)));
  return ExitCodeOf(checks);
}

} // namespace

Action DefineDoctor(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<DoctorOptions>();
  AddConnectionOptions(app, options->connection);
  AddOption(app, "--trust", options->trustFiles,
            "File of the service's certificates, PEM or DER, to be checked; may be repeated")
      .TypeName("CERT");
  return [options, &output] { return Diagnose(*options, output); };
}

} // namespace SsoClient::Tool
