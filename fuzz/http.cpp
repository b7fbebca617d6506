// The bytes of a connection, sent to a complete server in two pieces. For any bytes, the server answers
// with complete HTTP responses and then closes the connection.
#include "http.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace vorn::server {
namespace {

// Accepts every request whose target begins with "/e" and answers with the size of its body.
class SizeService : public Service {
 public:
  class Size : public Exchange {
   public:
    std::optional<Response> Receive(std::string_view piece) override {
      size_ += piece.size();
      if (size_ > 1000) return Response{413, "large", {}};
      return std::nullopt;
    }
    void Run(Answer answer) override { answer({200, std::to_string(size_), {}}); }

   private:
    std::size_t size_ = 0;
  };

  std::variant<std::shared_ptr<Exchange>, Response> Begin(const Head& head) override {
    if (head.target.substr(0, 2) == "/e") return std::make_shared<Size>();
    return Response{404, "nothing", {}};
  }
  Response Refuse(int status, std::string_view text) const override { return {status, std::string(text), {}}; }
};

class FuzzedServer {
 public:
  FuzzedServer() {
    char folder[] = "/tmp/fuzz-http-XXXXXX";
    if (mkdtemp(folder) == nullptr) std::abort();
    path_ = std::string(folder) + "/socket";
    std::string error;
    std::vector<Listener> listeners;
    listeners.push_back(*OpenListener("unix:" + path_, &error));
    server_ = std::make_unique<HttpServer>(service_, std::move(listeners));
  }
  ~FuzzedServer() {
    server_.reset();
    rmdir(path_.substr(0, path_.rfind('/')).c_str());
  }

  // Returns everything that the server sends.
  std::string Exchange(std::string_view first, std::string_view second) const;

 private:
  SizeService service_;
  std::string path_;
  std::unique_ptr<HttpServer> server_;
};

std::string FuzzedServer::Exchange(std::string_view first, std::string_view second) const {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  path_.copy(address.sun_path, sizeof address.sun_path - 1);
  const UniqueFd client(socket(AF_UNIX, SOCK_STREAM, 0));
  if (connect(client.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) std::abort();
  // The server may have closed by the time of the second piece.
  send(client.get(), first.data(), first.size(), MSG_NOSIGNAL);
  send(client.get(), second.data(), second.size(), MSG_NOSIGNAL);
  shutdown(client.get(), SHUT_WR);
  std::string answers;
  char bytes[4096];
  for (ssize_t count; (count = recv(client.get(), bytes, sizeof bytes, 0)) > 0;) {
    answers.append(bytes, static_cast<std::size_t>(count));
  }
  return answers;
}

// Removes one response from the front. Returns false if there is no complete one.
bool TakeResponse(std::string_view* answers) {
  static constexpr std::string_view kLength = "Content-Length: ";
  const std::size_t end = answers->find("\r\n\r\n");
  if (answers->substr(0, 9) != "HTTP/1.1 " || end == std::string_view::npos) return false;
  const std::size_t length = answers->substr(0, end).find(kLength);
  if (answers->substr(9, 3) == "100") {
    answers->remove_prefix(end + 4);
    return true;
  }
  if (length == std::string_view::npos) return false;
  const std::size_t size = std::strtoul(answers->data() + length + kLength.size(), nullptr, 10);
  answers->remove_prefix(end + 4);
  const bool whole = answers->size() >= size;
  answers->remove_prefix(whole ? size : 0);
  return whole;
}

}  // namespace
}  // namespace vorn::server

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  using namespace vorn::server;  // NOLINT(google-build-using-namespace)
  static const FuzzedServer server;
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  // An answer to HEAD has the length of a body that does not follow.
  if (text.find("HEAD") != std::string_view::npos) return 0;
  const std::size_t split = size == 0 ? 0 : data[size - 1] * size / 256;
  const std::string all = server.Exchange(text.substr(0, split), text.substr(split));
  for (std::string_view answers = all; !answers.empty();) {
    if (!TakeResponse(&answers)) std::abort();
  }
  return 0;
}
