// The resources of the server: the methods of the loaded modules, their list and description, the health checks,
// and the console.
#ifndef VORN_SERVER_WEB_API_H
#define VORN_SERVER_WEB_API_H

#include <array>
#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>
#include <variant>
#include <vector>

#include "audit.h"
#include "authenticator.h"
#include "browser_guard.h"
#include "budget.h"
#include "console.h"
#include "http.h"
#include "routes.h"
#include "server_metrics.h"
#include "sign_in_call.h"
#include "upload.h"
#include "worker_pool.h"

namespace vorn::server {

class WebApi : public Service {
 public:
  struct Limits {
    std::chrono::milliseconds call{60000};  // until a call is answered with 504
    std::chrono::milliseconds ready{1000};  // in which a worker must be free
  };

  // The objects that answer requests. All must outlive the WebApi.
  struct Parts {
    const Routes& routes;
    const UploadFolder& uploads;
    Workers& workers;
    Budget& memory;  // of parsed parameters
    const OwnNames& names;
    const AuditSink& audit;
    CallMetrics& metrics;
    const std::vector<MetricsSource>& figures;  // for "/metrics", beside those of the calls
    const Authenticator& authenticator;
    SignInCall::Environment sign_in;
    const Console& console;
  };

  explicit WebApi(Parts parts);
  WebApi(Parts parts, Limits limits);

  std::variant<std::shared_ptr<Exchange>, Response> Begin(const Head& head) override;
  void Dispatch() override { parts_.workers.Wake(); }
  bool EndWaitingCall() override { return parts_.workers.Displace(); }
  Response Refuse(int status, std::string_view text) const override;

 private:
  using Begun = std::variant<std::shared_ptr<Exchange>, Response>;

  // A resource that is read with GET. A public one needs no credentials.
  struct Page {
    std::string_view path;
    bool is_public;
    Begun (WebApi::*begin)(const Head& head) const;
  };
  static const std::array<Page, 8> kPages;

  Begun BeginFor(const CallerPtr& caller, const Page* page, const Head& head) const;
  Begun BeginSignIn(const Head& head) const;
  Begun BeginPage(const Page& page, const Head& head) const;
  Begun BeginConsole(const Head& head) const;
  Begun List(const Head& head) const;
  Begun OpenApi(const Head& head) const;
  Begun Docs(const Head& head) const;
  Begun DocsStyle(const Head& head) const;
  Begun Alive(const Head& head) const;
  Begun Ready(const Head& head) const;
  Begun Metrics(const Head& head) const;
  Begun MakeOnWorker(const void* page, const Head& head, std::chrono::milliseconds time,
                     std::function<Response()> make) const;
  Begun BeginCall(const Route& route, const CallerPtr& caller, const Head& head) const;

  const Parts parts_;
  const Limits limits_;
  const Response list_;        // of the methods
  const Response docs_;        // the documentation for people
  const Response docs_style_;  // its style sheet

  // The description of the methods. The network thread makes it for the first request, because that takes a third of
  // the time of a start.
  mutable std::optional<Response> open_api_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_WEB_API_H
