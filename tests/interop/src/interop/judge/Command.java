// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.io.IOException;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.List;
import java.util.concurrent.TimeUnit;

/** A program that runs to its end. */
final class Command {
  /** How a program ended, and what it wrote. */
  record Outcome(int status, String output, String errors) {
    boolean succeeded() {
      return status == 0;
    }

    /** The status and the first line of the errors, for a message. */
    String summary() {
      return "exit status " + status + (errors.isBlank() ? "" : ": " + errors.lines().findFirst().orElse(""));
    }
  }

  private static final int LIMIT_SECONDS = 120;

  private Command() {
  }

  static Outcome run(Path folder, List<String> arguments) throws IOException, InterruptedException {
    Path output = Files.createTempFile(folder, "output", ".txt");
    Path errors = Files.createTempFile(folder, "errors", ".txt");
    Process process = new ProcessBuilder(new ArrayList<>(arguments)).redirectOutput(output.toFile())
      .redirectError(errors.toFile()).start();
    process.getOutputStream().close();
    if (!process.waitFor(LIMIT_SECONDS, TimeUnit.SECONDS)) {
      process.destroyForcibly();
      throw new IOException("no end after " + LIMIT_SECONDS + " s: " + String.join(" ", arguments));
    }
    Outcome outcome = new Outcome(process.exitValue(), Files.readString(output, StandardCharsets.UTF_8),
      Files.readString(errors, StandardCharsets.UTF_8));
    Files.delete(output);
    Files.delete(errors);
    return outcome;
  }
}
