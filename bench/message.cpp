// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares signing a message with the one signature that it needs, verifying it with the cryptography that no verification
/// can avoid, and the replay guard with its limit of 300 ns a message at a million messages.
///
/// The message has a body of 2 KB and a holder-of-key token of 5 KB, both with RSA-2048. The requests by RFC 9421 have the same
/// token and the same body. Keys of the JSON that are not self-explanatory: "verify" has the time of `MessageVerifier::Verify`.
/// "replay_guard" has nanoseconds for each call with a million remembered messages: "fill_ns" while they are remembered,
/// "steady_ns" while for each new message another one expires, "repeated_ns" for messages that are known. "worst_ns" is
/// the largest of them, and "ratio" divides it by the limit.

#include "message_limits.h"
#include "program.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/proof/http_proof.h>
#include <ssoclient/proof/message_verifier.h>
#include <ssoclient/proof/replay_guard.h>
#include <ssoclient/proof/sign_http_request.h>
#include <ssoclient/proof/sign_message.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/core/environment.h>
#include <tarvel/crypto/private_key.h>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Bench {

namespace {

constexpr std::size_t BODY_BYTES = 2000;
constexpr std::int64_t DAY_SEC = 86400; // messages are verified until the program ends

/// What messages are made from and verified with. It is made once, as in a client and in a service.
struct World {
  const Tarvel::Ref<const Tarvel::Crypto::PrivateKey> key =
      Tarvel::Crypto::LoadPrivateKey(TOKEN_DATA_DIR "/holder.key");
  const SsoClient::TokenVerifier tokens{Tarvel::Crypto::LoadCertificates(TOKEN_DATA_DIR "/sts-rsa.crt")};
  const std::shared_ptr<const SsoClient::SamlToken> token =
      tokens.Verify(ReadFile(TOKEN_DATA_DIR "/holder-of-key.xml"));
  const std::string content = std::string(BODY_BYTES, 'x');
  const std::string envelope = "<s:Envelope xmlns:s=\"http://www.w3.org/2003/05/soap-envelope\"><s:Body><data>" +
                               content + "</data></s:Body></s:Envelope>";
  SsoClient::SecurityHeaderOptions signing;
  SsoClient::MessageVerifierOptions verifying;
  SsoClient::HttpRequest request{"POST", "https://files.corp.example/read", {{"Content-Type", "text/plain"}}, content};

  World() {
    signing.lifetimeSec = DAY_SEC;
    verifying.maxAgeSec = DAY_SEC;
  }

  std::string Sign() const { return SsoClient::SignMessage(envelope, *token, *key, {}, signing); }
};

const World &GetWorld() {
  static const World world;
  return world;
}

void SignMessage(benchmark::State &state) {
  const World &world = GetWorld();
  for (auto _ : state) {
    benchmark::DoNotOptimize(world.Sign());
  }
}

void VerifyMessage(benchmark::State &state) {
  const World &world = GetWorld();
  const std::string message = world.Sign();
  const SsoClient::MessageVerifier verifier(world.tokens, world.verifying);
  for (auto _ : state) {
    benchmark::DoNotOptimize(verifier.Verify(message));
  }
}

void SignRequest(benchmark::State &state) {
  const World &world = GetWorld();
  for (auto _ : state) {
    benchmark::DoNotOptimize(SsoClient::SignHttpRequest(world.request, *world.token, *world.key));
  }
}

void VerifyRequest(benchmark::State &state) {
  const World &world = GetWorld();
  SsoClient::HttpRequest request = world.request;
  for (const auto &field : SsoClient::SignHttpRequest(request, *world.token, *world.key)) {
    request.headers.push_back(field);
  }
  SsoClient::HttpProofOptions options;
  options.maxAgeSec = DAY_SEC;
  for (auto _ : state) {
    benchmark::DoNotOptimize(SsoClient::VerifyHttpProof(request, world.tokens, options));
  }
}

void SignBare(benchmark::State &state) {
  RsaLimit limit(TOKEN_DATA_DIR "/holder.key");
  for (auto _ : state) {
    limit.Sign();
  }
}

void CheckBare(benchmark::State &state) {
  RsaLimit limit(TOKEN_DATA_DIR "/holder.key");
  const std::vector<std::size_t> lengths = ListSignedLengths(GetWorld().Sign());
  for (auto _ : state) {
    limit.Check();
    limit.Check();
    for (const std::size_t length : lengths) {
      limit.Hash(length);
    }
  }
}

// The replay guard.

constexpr std::size_t MESSAGES = 1'000'000;
constexpr double GUARD_LIMIT_NS = 300;

/// Different for each number, and distributed like a digest.
SsoClient::MessageIdentifier MakeIdentifier(std::uint64_t number) {
  constexpr std::uint64_t MULTIPLIERS[] = {0x9e3779b97f4a7c15, 0xbf58476d1ce4e5b9, 0x94d049bb133111eb,
                                           0xd6e8feb86659fd93};
  SsoClient::MessageIdentifier identifier{};
  std::uint8_t *position = identifier.data();
  for (const std::uint64_t multiplier : MULTIPLIERS) {
    const std::uint64_t word = (number + 1) * multiplier;
    position = std::copy_n(reinterpret_cast<const std::uint8_t *>(&word), sizeof word, position);
  }
  return identifier;
}

Tarvel::System::DateTime At(std::int64_t microseconds) {
  return Tarvel::System::DateTime::FromTimePoint(
      std::chrono::time_point<std::chrono::system_clock, std::chrono::microseconds>(
          std::chrono::microseconds(microseconds)));
}

/// Throws unless the guard gives this answer.
void Expect(SsoClient::ReplayGuard &guard, std::uint64_t message, std::int64_t until,
            SsoClient::ReplayGuard::Answer answer) {
  if (guard.Remember(MakeIdentifier(message), At(until)) != answer) {
    throw std::runtime_error("the replay guard returns another answer");
  }
}

/// A guard for a million messages that have not expired, and the number of the next message. A message expires a million
/// microseconds after its number.
struct FullGuard {
  const std::shared_ptr<SsoClient::ReplayGuard> guard = SsoClient::CreateMemoryReplayGuard(MESSAGES + MESSAGES / 4);
  std::uint64_t next = 0;

  void Remember() {
    Expect(*guard, next, static_cast<std::int64_t>(next + MESSAGES), SsoClient::ReplayGuard::Answer::FIRST);
    ++next;
  }
};

void FillGuard(benchmark::State &state) {
  const Tarvel::ScopedEnvironment clock({[] { return std::int64_t{0}; }, {}});
  for (auto _ : state) {
    state.PauseTiming();
    auto full = std::make_unique<FullGuard>();
    state.ResumeTiming();
    for (std::size_t i = 0; i < MESSAGES; ++i) {
      full->Remember();
    }
    state.PauseTiming();
    full.reset();
    state.ResumeTiming();
  }
}

void ReplaceInGuard(benchmark::State &state) {
  FullGuard full;
  std::int64_t now = 0;
  const Tarvel::ScopedEnvironment clock({[&now] { return now; }, {}});
  for (std::size_t i = 0; i < 2 * MESSAGES; ++i) {
    now = static_cast<std::int64_t>(full.next);
    full.Remember();
  }
  for (auto _ : state) {
    for (std::size_t i = 0; i < MESSAGES; ++i) {
      now = static_cast<std::int64_t>(full.next);
      full.Remember();
    }
  }
}

void RepeatInGuard(benchmark::State &state) {
  const Tarvel::ScopedEnvironment clock({[] { return std::int64_t{0}; }, {}});
  FullGuard full;
  for (std::size_t i = 0; i < MESSAGES; ++i) {
    full.Remember();
  }
  for (auto _ : state) {
    for (std::uint64_t i = 0; i < MESSAGES; ++i) {
      // In another order than that in which they were remembered.
      Expect(*full.guard, i * 7919 % MESSAGES, 1, SsoClient::ReplayGuard::Answer::REPEATED);
    }
  }
}

void RegisterBenchmarks() {
  using benchmark::RegisterBenchmark;
  RegisterBenchmark("Sign/limit", SignBare)->Unit(benchmark::kMicrosecond);
  RegisterBenchmark("SignMessage", SignMessage)->Unit(benchmark::kMicrosecond);
  RegisterBenchmark("SignHttpRequest", SignRequest)->Unit(benchmark::kMicrosecond);
  RegisterBenchmark("Verify/limit", CheckBare)->Unit(benchmark::kMicrosecond);
  RegisterBenchmark("MessageVerifier", VerifyMessage)->Unit(benchmark::kMicrosecond);
  RegisterBenchmark("VerifyHttpProof", VerifyRequest)->Unit(benchmark::kMicrosecond);
  RegisterBenchmark("Guard/fill", FillGuard)->Unit(benchmark::kMicrosecond)->Iterations(1);
  RegisterBenchmark("Guard/steady", ReplaceInGuard)->Unit(benchmark::kMicrosecond)->Iterations(1);
  RegisterBenchmark("Guard/repeated", RepeatInGuard)->Unit(benchmark::kMicrosecond)->Iterations(1);
}

/// Nanoseconds for each message, of a benchmark that handles a million of them in an iteration.
double NanosecondsEach(const Medians &medians, const std::string &name) {
  constexpr double NANOSECONDS_PER_MICROSECOND = 1000;
  return medians.at(name + "/iterations:1").cpuUs * NANOSECONDS_PER_MICROSECOND / MESSAGES;
}

// Times are those of the measuring thread's CPU.
void WriteSummary(const Medians &medians, std::ostream &out) {
  const double sign = medians.at("SignMessage").cpuUs;
  const double signLimit = medians.at("Sign/limit").cpuUs;
  const double verify = medians.at("MessageVerifier").cpuUs;
  const double verifyLimit = medians.at("Verify/limit").cpuUs;
  const double fill = NanosecondsEach(medians, "Guard/fill");
  const double steady = NanosecondsEach(medians, "Guard/steady");
  const double repeated = NanosecondsEach(medians, "Guard/repeated");
  const double worst = std::max({fill, steady, repeated});
  out << "{\n\"message\": {\"ours_us\": " << sign << ", \"limit_us\": " << signLimit
      << ", \"ratio\": " << sign / signLimit << ",\n  \"verify\": {\"ours_us\": " << verify
      << ", \"limit_us\": " << verifyLimit << ", \"ratio\": " << verify / verifyLimit
      << "},\n  \"http\": {\"sign_us\": " << medians.at("SignHttpRequest").cpuUs
      << ", \"verify_us\": " << medians.at("VerifyHttpProof").cpuUs
      << "},\n  \"replay_guard\": {\"messages\": " << MESSAGES << ", \"fill_ns\": " << fill
      << ", \"steady_ns\": " << steady << ", \"repeated_ns\": " << repeated << ", \"worst_ns\": " << worst
      << ", \"limit_ns\": " << GUARD_LIMIT_NS << ", \"ratio\": " << worst / GUARD_LIMIT_NS << "}}\n}\n";
}

} // namespace

constexpr Program PROGRAM{"message", RegisterBenchmarks, WriteSummary};

} // namespace Bench

int main(int argc, char **argv) {
  return Bench::RunProgram(Bench::PROGRAM, argc, argv);
}
