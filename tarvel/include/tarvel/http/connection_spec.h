// SPDX-License-Identifier: Apache-2.0
/// @file
/// How a user agent's connections are opened.

#pragma once

#include <tarvel/core/exception.h>
#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>
#include <tarvel/system/stream.h>

#include <functional>
#include <string>

namespace Tarvel {
namespace Http {

/// Opens connections to one endpoint. Immutable; safe on any thread.
class TARVEL_API ConnectionSpec : public Object {
public:
  /// Called once, on an I/O thread, with the stream and null, or with an exception; the stream may be given then too.
  using ConnectCompletion = std::function<void(const Ref<System::Stream> &, const Exception *)>;

  virtual std::string ToString() const = 0;
  virtual std::string GetHost() const = 0;
  virtual std::string GetEndpointString() const = 0;
  virtual bool IsReuseOnAuthErrorSupported() const = 0;
  /// Starts to connect. The returned item cancels the attempt; the completion then gets an exception.
  virtual Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const = 0;

protected:
  ~ConnectionSpec() override;
};

/// The base of connection specifications that are written outside the platform.
class TARVEL_API CustomConnectionSpec : public virtual ConnectionSpec {
protected:
  ~CustomConnectionSpec() override;
};

} // namespace Http
} // namespace Tarvel
