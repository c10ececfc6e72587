// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Writer`, a stream of bytes to write, and a writer that collects a text.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>

#include <string>
#include <string_view>

namespace Tarvel {

/// A stream that accepts bytes in order. For one thread at a time.
class TARVEL_API Writer : public Object {
public:
  /// Appends `bytes`, all of them.
  virtual void Write(std::string_view bytes) = 0;

protected:
  ~Writer() override;
};

/// A writer that collects what is written, and overwrites it when it is destroyed.
class TARVEL_API StringWriter : public Writer {
public:
  /// What has been written so far; valid until the next write.
  virtual const std::string &GetText() const = 0;

  /// Returns what has been written and starts again with an empty text. The caller owns the text, and must overwrite it
  /// if it is secret.
  virtual std::string TakeText() = 0;

protected:
  ~StringWriter() override;
};

/// An empty string writer.
TARVEL_API Ref<StringWriter> CreateStringWriter();

} // namespace Tarvel
