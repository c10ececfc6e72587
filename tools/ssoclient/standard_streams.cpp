// SPDX-License-Identifier: Apache-2.0

#include "standard_streams.h"

#include <fcntl.h>
#include <unistd.h>

namespace SsoClient::Tool {

void KeepStandardStreamsApart() noexcept {
  for (int stream = STDIN_FILENO; stream <= STDERR_FILENO; ++stream) {
    if (fcntl(stream, F_GETFD) < 0) {
      // `open` returns the lowest free descriptor, which is this one. It is opened in the wrong direction on purpose.
      open("/dev/null", stream == STDIN_FILENO ? O_WRONLY : O_RDONLY);
    }
  }
}

} // namespace SsoClient::Tool
