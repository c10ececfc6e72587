// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Reader`, a stream of bytes to read, and a reader over a text.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>

#include <cstddef>
#include <string>

namespace Tarvel {

/// A stream of bytes with one position. One thread at a time may use it. A reader owns its bytes.
class TARVEL_API Reader : public Object {
public:
  /// Reads up to `length` bytes into `buffer` and returns how many; 0 means the end.
  /// @throws IOException when the source fails.
  virtual std::size_t Read(char *buffer, std::size_t length) = 0;

  /// Everything from the current position to the end.
  /// @param maximumBytes a reader may stop when it has read more than this; the result is then longer than this.
  /// @throws IOException when the source fails.
  virtual std::string ReadToEnd(std::size_t maximumBytes);

  /// The charset that the source declares for its bytes, in its own spelling ("windows-1252"); empty when it declares
  /// none. It is for messages only, because text that the reader can convert to UTF-8 has been converted already.
  virtual std::string GetDeclaredCharset() const;

protected:
  ~Reader() override;
};

/// A reader over `text`, which it owns, and overwrites when it is destroyed.
TARVEL_API Ref<Reader> CreateStringReader(std::string text);

} // namespace Tarvel
