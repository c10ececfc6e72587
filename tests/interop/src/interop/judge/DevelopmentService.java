// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.io.BufferedReader;
import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.Map;
import java.util.regex.Matcher;
import java.util.regex.Pattern;

/** The project's own token service, in a process of its own, until it is closed. */
final class DevelopmentService implements AutoCloseable {
  static final Map<String, String> PASSWORDS = Map.of("alice@corp.example", "wonderland");

  private final Process process;
  private final Path state;
  private final Path passwordFile;
  private final String url;

  DevelopmentService(Path program, Path folder) throws IOException {
    state = folder.resolve("service");
    passwordFile = folder.resolve("password.txt");
    Files.writeString(passwordFile, "wonderland\n");
    process = new ProcessBuilder(program.toString(), "--state", state.toString(), "--port", "0", "--until-eof")
      .redirectError(folder.resolve("service.log").toFile()).start();
    BufferedReader reader = process.inputReader();
    Matcher matcher = Pattern.compile("\"url\": ?\"([^\"]+)\"").matcher(String.valueOf(reader.readLine()));
    if (!matcher.find()) {
      throw new IOException("the service does not start: " + Files.readString(folder.resolve("service.log")));
    }
    url = matcher.group(1);
  }

  String url() {
    return url;
  }

  Path authorityFile() {
    return state.resolve("authority.crt");
  }

  Path signingFile() {
    return state.resolve("signing.crt");
  }

  Path clientKeyFile() {
    return state.resolve("client.key");
  }

  Path passwordFile() {
    return passwordFile;
  }

  Identity client() throws IdentityException {
    return identity("client");
  }

  Identity otherClient() throws IdentityException {
    return identity("other-client");
  }

  /** The HTTPS server's, which is for localhost. */
  Identity tls() throws IdentityException {
    return identity("tls");
  }

  @Override
  public void close() throws IOException {
    process.getOutputStream().close();
    process.onExit().join();
  }

  private Identity identity(String name) {
    try {
      return Identity.load(state.resolve(name + ".key"), state.resolve(name + ".crt"));
    } catch (Exception failure) {
      throw new IdentityException(failure);
    }
  }

  /** A key or certificate of the service cannot be read. */
  static final class IdentityException extends RuntimeException {
    private static final long serialVersionUID = 1;

    IdentityException(Exception cause) {
      super(cause);
    }
  }
}
