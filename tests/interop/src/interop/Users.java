// SPDX-License-Identifier: Apache-2.0
package interop;

import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.HashMap;
import java.util.List;
import java.util.Map;
import javax.security.auth.callback.Callback;
import javax.security.auth.callback.CallbackHandler;
import org.apache.wss4j.common.ext.WSPasswordCallback;

/**
 * The users: a file with lines of a name, a password and any number of groups, with a tab between them. WSS4J calls the
 * handler for the password of a user, and for the password of the service's key.
 */
final class Users implements CallbackHandler {
  private final Map<String, List<String>> users = new HashMap<>();

  Users(Path file) throws IOException {
    for (String line : Files.readAllLines(file)) {
      final List<String> fields = List.of(line.split("\t"));
      users.put(fields.get(0), fields.subList(1, fields.size()));
    }
  }

  boolean contains(String name) {
    return users.containsKey(name);
  }

  List<String> groupsOf(String name) {
    return contains(name) ? users.get(name).subList(1, users.get(name).size()) : List.of();
  }

  @Override
  public void handle(Callback[] callbacks) {
    for (Callback callback : callbacks) {
      if (callback instanceof WSPasswordCallback) {
        final WSPasswordCallback asked = (WSPasswordCallback) callback;
        if (asked.getUsage() == WSPasswordCallback.SIGNATURE) {
          asked.setPassword(new String(DeployedKeys.PASSWORD));
        } else if (contains(asked.getIdentifier())) {
          asked.setPassword(users.get(asked.getIdentifier()).get(0));
        }
      }
    }
  }
}
