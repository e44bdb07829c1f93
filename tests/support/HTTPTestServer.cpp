#include "tests/support/HTTPTestServer.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <stdexcept>
#include <utility>

bool HTTPTestServer::Connection::send(std::string_view bytes) const {
  while (!bytes.empty()) {
    const ssize_t sent = ::send(socket_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (sent <= 0) return false;
    bytes.remove_prefix(static_cast<std::size_t>(sent));
  }
  return true;
}

void HTTPTestServer::Connection::reset() {
  // A reset makes the client's system drop what the client has not read yet.
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  const linger dropEverything{1, 0};
  setsockopt(socket_, SOL_SOCKET, SO_LINGER, &dropEverything, sizeof(dropEverything));
  closing_ = true;
}

bool HTTPTestServer::Connection::receiveRequest() {
  constexpr std::string_view kEnd = "\r\n\r\n";
  std::array<char, 4096> buffer{};
  std::size_t end = 0;
  while ((end = received_.find(kEnd)) == std::string::npos) {
    const ssize_t size = recv(socket_, buffer.data(), buffer.size(), 0);
    if (size <= 0) return false;
    received_.append(buffer.data(), static_cast<std::size_t>(size));
  }
  request_ = received_.substr(0, end + kEnd.size());
  received_.erase(0, request_.size());
  return true;
}

namespace {

/// Binds the socket to a port of the loopback interface that the system chooses.
bool bindToLoopback(int socket, HTTPTestServer::Family family) {
  sockaddr_in old{};
  old.sin_family = AF_INET;
  old.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  sockaddr_in6 address{};
  address.sin6_family = AF_INET6;
  address.sin6_addr = in6addr_loopback;
  return family == HTTPTestServer::Family::kIPv4
             ? bind(socket, reinterpret_cast<sockaddr*>(&old), sizeof(old)) == 0
             : bind(socket, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0;
}

int openSocket(HTTPTestServer::Family family) {
  return socket(family == HTTPTestServer::Family::kIPv4 ? AF_INET : AF_INET6,
                SOCK_STREAM | SOCK_CLOEXEC, 0);
}

}  // namespace

bool HTTPTestServer::isToBeHad(Family family) {
  const int socket = openSocket(family);
  const bool isBound = socket >= 0 && bindToLoopback(socket, family);
  if (socket >= 0) ::close(socket);
  return isBound;
}

HTTPTestServer::HTTPTestServer(Family family) : family_(family), listener_(openSocket(family)) {
  // A proxy that the environment names must not come between.
  setenv("no_proxy", "127.0.0.1,::1", 1);

  sockaddr_in6 address{};  // the port of the other family lies at the same place
  socklen_t size = sizeof(address);
  if (!bindToLoopback(listener_, family) || listen(listener_, 16) != 0 ||
      getsockname(listener_, reinterpret_cast<sockaddr*>(&address), &size) != 0) {
    throw std::runtime_error("The test server cannot listen");
  }
  port_ = ntohs(address.sin6_port);
  acceptThread_ = std::thread([this] { acceptConnections(); });
}

HTTPTestServer::~HTTPTestServer() {
  {
    const std::lock_guard lock(mutex_);
    stopping_ = true;
    shutdown(listener_, SHUT_RDWR);
    for (const int socket : sockets_) shutdown(socket, SHUT_RDWR);
  }
  acceptThread_.join();
  for (std::thread& thread : connectionThreads_) thread.join();
  ::close(listener_);
}

void HTTPTestServer::acceptConnections() {
  for (;;) {
    const int socket = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    if (socket < 0) return;
    const int on = 1;
    setsockopt(socket, IPPROTO_TCP, TCP_NODELAY, &on, sizeof(on));
    ++connections_;
    const std::lock_guard lock(mutex_);
    if (stopping_) {
      ::close(socket);
      return;
    }
    sockets_.push_back(socket);
    connectionThreads_.emplace_back([this, socket] { serveConnection(socket); });
  }
}

void HTTPTestServer::serveConnection(int socket) {
  Connection connection(socket);
  while (!connection.closing_ && connection.receiveRequest()) {
    const std::string& request = connection.request();
    const std::size_t begin = request.find(' ') + 1;
    const std::string path = request.substr(begin, request.find(' ', begin) - begin);
    Route route;
    {
      const std::lock_guard lock(mutex_);
      ++hits_[path];
      requests_.push_back(request);
      if (const auto found = routes_.find(path); found != routes_.end()) route = found->second;
    }
    if (route) {
      route(connection);
    } else {
      connection.send(response("no such page", "", "404 Not Found"));
    }
  }
  const std::lock_guard lock(mutex_);
  std::erase(sockets_, socket);
  ::close(socket);
}

void HTTPTestServer::serve(const std::string& path, Route route) {
  const std::lock_guard lock(mutex_);
  routes_[path] = std::move(route);
}

void HTTPTestServer::serve(const std::string& path, std::string answer) {
  serve(path, [answer = std::move(answer)](Connection& connection) { connection.send(answer); });
}

std::string HTTPTestServer::url(std::string_view path) const {
  const std::string host = family_ == Family::kIPv4 ? "127.0.0.1" : "[::1]";
  return "http://" + host + ":" + std::to_string(port_) + std::string(path);
}

int HTTPTestServer::hits(const std::string& path) const {
  const std::lock_guard lock(mutex_);
  const auto found = hits_.find(path);
  return found == hits_.end() ? 0 : found->second;
}

std::vector<std::string> HTTPTestServer::requests() const {
  const std::lock_guard lock(mutex_);
  return requests_;
}

std::string HTTPTestServer::response(std::string_view body, std::string_view extraHeaders,
                                     std::string_view status) {
  std::string text = "HTTP/1.1 ";
  text.append(status).append("\r\n").append(extraHeaders);
  text += "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n";
  return text.append(body);
}

std::string HTTPTestServer::redirect(std::string_view location, std::string_view status) {
  return response("moved", "Location: " + std::string(location) + "\r\n", status);
}
