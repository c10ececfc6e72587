// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/logger.h>

#include <tarvel/core/ref.h>
#include <tarvel/service/app.h>

#include <atomic>

namespace SsoClient {

namespace {

using Tarvel::Service::Logger;

// Holds one reference that is never released: a thread may log for as long as the process lives.
std::atomic<Logger *> publishedLogger{nullptr};

} // namespace

Logger &getLogger() {
  if (Logger *const logger = publishedLogger.load(std::memory_order_acquire)) {
    return *logger;
  }
  Tarvel::Ref<Logger> created =
      Logger::CreateLogger(Tarvel::Service::GetApp().GetRootLogger(), "SsoClient", LOG_LEVEL_OPERATION);
  Logger *published = nullptr;
  if (!publishedLogger.compare_exchange_strong(published, created.get(), std::memory_order_acq_rel)) {
    return *published;
  }
  return *created.Detach();
}

} // namespace SsoClient
