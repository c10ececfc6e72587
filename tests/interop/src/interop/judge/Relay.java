// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import com.sun.net.httpserver.HttpExchange;
import com.sun.net.httpserver.HttpsConfigurator;
import com.sun.net.httpserver.HttpsServer;
import java.io.IOException;
import java.net.InetAddress;
import java.net.InetSocketAddress;
import java.net.URI;
import java.net.http.HttpClient;
import java.net.http.HttpRequest;
import java.net.http.HttpResponse;
import java.util.concurrent.LinkedBlockingQueue;
import javax.net.ssl.SSLContext;

/** An HTTPS server on loopback that passes each request on unchanged, and keeps it. */
final class Relay implements AutoCloseable {
  /** A request: its Content-Type and its body. */
  record Request(String contentType, byte[] body) {
  }

  private final HttpsServer server;
  private final HttpClient client;
  private final URI target;
  private final LinkedBlockingQueue<Request> requests = new LinkedBlockingQueue<>();

  Relay(SSLContext context, URI target) throws IOException {
    this.target = target;
    client = HttpClient.newBuilder().sslContext(context).version(HttpClient.Version.HTTP_1_1).build();
    server = HttpsServer.create(new InetSocketAddress(InetAddress.getLoopbackAddress(), 0), 0);
    server.setHttpsConfigurator(new HttpsConfigurator(context));
    server.createContext("/", this::handle);
    server.start();
  }

  /** The address to use in place of the target's. */
  String url() {
    return "https://localhost:" + server.getAddress().getPort() + target.getPath();
  }

  /** The only request since the last call; null if there was none, or more than one. */
  Request take() {
    Request request = requests.poll();
    boolean isOnly = requests.isEmpty();
    requests.clear();
    return isOnly ? request : null;
  }

  @Override
  public void close() {
    server.stop(0);
  }

  private void handle(HttpExchange exchange) throws IOException {
    try (exchange) {
      byte[] body = exchange.getRequestBody().readAllBytes();
      String contentType = exchange.getRequestHeaders().getFirst("Content-Type");
      requests.add(new Request(contentType, body));
      HttpRequest.Builder onward = HttpRequest.newBuilder(target).POST(HttpRequest.BodyPublishers.ofByteArray(body))
        .header("Content-Type", contentType);
      String action = exchange.getRequestHeaders().getFirst("SOAPAction");
      if (action != null) {
        onward.header("SOAPAction", action);
      }
      HttpResponse<byte[]> answer = client.send(onward.build(), HttpResponse.BodyHandlers.ofByteArray());
      answer.headers().firstValue("Content-Type")
        .ifPresent(type -> exchange.getResponseHeaders().set("Content-Type", type));
      exchange.sendResponseHeaders(answer.statusCode(), answer.body().length == 0 ? -1 : answer.body().length);
      exchange.getResponseBody().write(answer.body());
    } catch (InterruptedException interruption) {
      Thread.currentThread().interrupt();
    }
  }
}
