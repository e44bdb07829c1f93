#pragma once

#include <atomic>
#include <chrono>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

/// An HTTP server on the loopback interface whose answers a test writes byte for byte, so that they
/// can also be wrong. Its port is chosen by the system; it stops when it is destroyed.
///
///   HTTPTestServer server;
///   server.serve("/feed", HTTPTestServer::response("<rss/>"));
///   readResource(*URL::parse(server.url("/feed")), error, kWholeReadLimit, 0);
///   EXPECT_EQ(server.hits("/feed"), 1);
class HTTPTestServer {
 public:
  /// One accepted connection, in the hands of a route.
  class Connection {
   public:
    explicit Connection(int socket) : socket_(socket) {}

    /// The request as it came, up to and with the empty line.
    const std::string& request() const { return request_; }
    /// False once the client is gone.
    bool send(std::string_view bytes) const;
    /// Closes the connection in an orderly way when the route returns; otherwise it stays open.
    void close() { closing_ = true; }
    /// The same by a reset, once the client has had time to read what was sent.
    void reset();

   private:
    friend class HTTPTestServer;
    bool receiveRequest();

    int socket_;
    bool closing_ = false;
    std::string received_;
    std::string request_;
  };
  using Route = std::function<void(Connection&)>;

  enum class Family { kIPv4, kIPv6 };

  explicit HTTPTestServer(Family family = Family::kIPv4);
  ~HTTPTestServer();
  HTTPTestServer(const HTTPTestServer&) = delete;
  HTTPTestServer& operator=(const HTTPTestServer&) = delete;

  /// Answers requests for the path (with its query, as it is sent). Unknown paths are answered with
  /// the status 404.
  void serve(const std::string& path, Route route);
  /// The same with an answer that is always the same; the connection stays open.
  void serve(const std::string& path, std::string answer);

  /// Whether this machine has a loopback interface of that family.
  static bool isToBeHad(Family family);

  std::string url(std::string_view path) const;
  int port() const { return port_; }
  int hits(const std::string& path) const;
  int connections() const { return connections_; }
  /// All requests in the order of their coming.
  std::vector<std::string> requests() const;

  /// An answer with a Content-Length that is right. Extra headers end with CR LF each.
  static std::string response(std::string_view body, std::string_view extraHeaders = "",
                              std::string_view status = "200 OK");
  /// An answer that sends the client elsewhere.
  static std::string redirect(std::string_view location, std::string_view status = "302 Found");

 private:
  void acceptConnections();
  void serveConnection(int socket);

  Family family_;
  int listener_ = -1;
  int port_ = 0;
  std::atomic<int> connections_ = 0;
  mutable std::mutex mutex_;  // guards everything below
  bool stopping_ = false;
  std::map<std::string, Route> routes_;
  std::map<std::string, int> hits_;
  std::vector<std::string> requests_;
  std::vector<int> sockets_;
  std::vector<std::thread> connectionThreads_;
  std::thread acceptThread_;
};
