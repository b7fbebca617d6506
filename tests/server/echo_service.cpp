#include "echo_service.h"

#include <algorithm>
#include <cstdlib>
#include <utility>

namespace vorn::server {

class EchoService::Echo : public Exchange {
 public:
  Echo(EchoService& service, std::string target) : service_(service), target_(std::move(target)) {}

  Authorization Authorize(Proceed proceed) override {
    if (target_ != "/ask") return Authorization::kGranted;
    const std::lock_guard<std::mutex> lock(service_.mutex_);
    service_.asked_.push_back(std::move(proceed));
    return Authorization::kPending;
  }

  std::optional<Response> Receive(std::string_view piece) override {
    body_ += piece;
    const std::lock_guard<std::mutex> lock(service_.mutex_);
    service_.largest_piece_ = std::max(service_.largest_piece_, piece.size());
    if (body_.find("stop") != std::string::npos) return Response{413, "stopped"};
    return std::nullopt;
  }

  void Run(Answer answer) override {
    const std::lock_guard<std::mutex> lock(service_.mutex_);
    if (target_ == "/hold") return service_.held_.push_back(std::move(answer));
    service_.threads_.emplace_back([body = body_, answer] { answer({200, body, {{"Extra", "yes"}}}); });
  }

  void Abandon() override {
    const std::lock_guard<std::mutex> lock(service_.mutex_);
    ++service_.abandoned_;
  }

 private:
  EchoService& service_;
  const std::string target_;
  std::string body_;
};

EchoService::~EchoService() {
  for (std::thread& thread : threads_) thread.join();
}

std::variant<std::shared_ptr<Exchange>, Response> EchoService::Begin(const Head& head) {
  const std::lock_guard<std::mutex> lock(mutex_);
  ++heads_;
  last_ = {std::string(head.target),
           std::string(head.query),
           std::string(head.host.value_or("")),
           head.peer,
           head.recent_requests,
           {}};
  for (const auto& [name, value] : head.headers) last_.headers.emplace(name, value);
  if (head.target == "/no") return Response{404, "refused"};
  if (head.target == "/fixed") return fixed_;
  return std::make_shared<Echo>(*this, std::string(head.target));
}

int EchoService::heads() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return heads_;
}

std::size_t EchoService::largest_piece() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return largest_piece_;
}

int EchoService::abandoned() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return abandoned_;
}

EchoService::Seen EchoService::last() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return last_;
}

void EchoService::SetFixed(Response response) {
  const std::lock_guard<std::mutex> lock(mutex_);
  fixed_ = std::move(response);
}

Answer EchoService::AwaitHeld() {
  Answer answer;
  Eventually([&] {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (held_.empty()) return false;
    answer = std::move(held_.back());
    held_.pop_back();
    return true;
  });
  return answer;
}

Proceed EchoService::AwaitAsked() {
  Proceed proceed;
  Eventually([&] {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (asked_.empty()) return false;
    proceed = std::move(asked_.back());
    asked_.pop_back();
    return true;
  });
  return proceed;
}

void HttpTest::Start(const HttpLimits& limits, const HttpParts& parts) {
  static const std::string kHost = "127.0.0.1:";
  std::string error;
  std::vector<Listener> listeners;
  listeners.push_back(*OpenListener("unix:" + path_, &error));
  listeners.push_back(*OpenListener(kHost + "0", &error));
  port_ = std::atoi(listeners[1].name().c_str() + kHost.size());
  server_ = std::make_unique<HttpServer>(service_, std::move(listeners), limits, parts);
}

}  // namespace vorn::server
