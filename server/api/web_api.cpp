#include "web_api.h"

#include <algorithm>
#include <functional>
#include <string>
#include <utility>

#include "answer.h"
#include "body.h"
#include "browser_guard.h"
#include "form_body.h"
#include "header_value.h"
#include "method_call.h"
#include "multipart.h"
#include "openapi.h"
#include "resources.h"
#include "worker_page.h"

namespace vorn::server {
namespace {

using NewBody = std::variant<std::unique_ptr<Body>, Response>;

// A link of another site may lead to the console: the page is the same for everybody, and what it loads and calls is
// fetched by itself.
bool FollowsLink(const Head& head) {
  return Console::IsPage(head.target) && head.method == "GET" && head.Header("Sec-Fetch-Mode") == "navigate";
}

std::optional<Response> KeepOtherSitesOut(const Head& head, const OwnNames& names) {
  const std::string_view host = head.host.value_or("");
  // At a Unix socket, any name stands for this server, unless there may be a proxy: the rights of the proxy's account
  // depend on the name, so that none may be spelt in another way ("nas.example.").
  const bool any_name = head.peer.credentials && !names.HaveGiven();
  if (!any_name && !names.Include(host, head.secure)) {
    return Refusal(421, "The Host header names another server. Names of this one can be set with --host-name.");
  }
  const std::optional<std::string_view> origin = head.Header("Origin");
  const bool own_origin = !origin || names.AreOrigin(*origin, host, head.secure);
  const bool own_fetch = IsOwnFetch(head.Header("Sec-Fetch-Site").value_or("none")) || FollowsLink(head);
  if (own_origin && own_fetch) return std::nullopt;
  return Refusal(403, "Web pages of other sites, and of other ports, may not use this server.");
}

Response MethodNotAllowed(std::string_view path, const std::string& allowed) {
  Response response = Refusal(405, "At \"" + std::string(path) + "\" only " + allowed + " is possible.");
  response.headers.emplace_back("Allow", allowed);
  return response;
}

NewBody OpenJson(const Head& head, Budget& memory) {
  if (head.content_length > JsonBody::kMaxBytes) return JsonBody::TooLarge();
  return std::make_unique<JsonBody>(memory);
}

NewBody OpenForm(const Head& head, const HeaderValue& type, const UploadFolder& uploads) {
  const auto boundary = type.parameters.find("boundary");
  if (boundary == type.parameters.end() || !MultipartParser::IsBoundary(boundary->second)) {
    return Refusal(400, "The Content-Type of the form names no proper boundary.");
  }
  if (head.content_length > FormBody::kMaxBytes) return FormBody::TooLarge();
  return std::make_unique<FormBody>(boundary->second, uploads);
}

bool IsUtf8(const HeaderValue& type) {
  const auto charset = type.parameters.find("charset");
  return charset == type.parameters.end() || EqualsIgnoringCase(charset->second, "utf-8");
}

// A form is accepted by methods that take a file only: a page of another site can send one without a CORS preflight.
NewBody OpenBody(const Head& head, const Route& route, const WebApi::Parts& parts) {
  if (!head.has_body) return std::make_unique<JsonBody>(parts.memory);
  const std::optional<HeaderValue> type = ParseHeaderValue(head.content_type);
  if (type && !IsUtf8(*type)) return Refusal(415, "Parameters are sent in UTF-8.");
  if (type && type->value == "application/json") return OpenJson(head, parts.memory);
  if (type && type->value == "multipart/form-data" && route.method.takes_file) {
    return OpenForm(head, *type, parts.uploads);
  }
  return Refusal(415, std::string("This method takes its parameters as application/json") +
                          (route.method.takes_file ? " and its file as multipart/form-data" : "") + ", not as \"" +
                          std::string(head.content_type) + "\".");
}

// Refuses a call that the caller may not make, whatever its parameters are. The share that they name is compared when
// they have been read.
std::optional<Response> RefuseCaller(const Caller& caller, const Route& route, bool rehearses) {
  if (caller.role != Role::kAdministrator && !route.for_readers && !rehearses) {
    return Refusal(403, "This caller may read only.");
  }
  if (!Permits(caller.apis, route.row.api)) return Refusal(403, "This token is not for this API.");
  if (!caller.shares.empty() && route.method.share_parameter.empty()) {
    return Refusal(403, "This token is for methods of shared folders only.");
  }
  return std::nullopt;
}

// The peer of a call in the order of turns: callers and addresses have turns of their own, and local processes, which
// have no address.
std::string TurnOf(const Peer& peer, std::string_view caller) {
  std::string turn = peer.credentials ? "pid " + std::to_string(peer.credentials->pid) : peer.ShareKey();
  return turn.append(1, '\0').append(caller);
}

// The value of If-Match, of all its lines (RFC 9110, 5.3).
std::optional<std::string> IfMatchOf(const Head& head) {
  std::optional<std::string> value;
  for (const auto& [name, line] : head.headers) {
    if (EqualsIgnoringCase(name, "If-Match")) value = value ? *value + "," + std::string(line) : std::string(line);
  }
  return value;
}

// Refuses a request with a query, and names its first parameter.
std::optional<Response> RefuseQuery(std::string_view query) {
  const std::string_view name = query.substr(0, query.find_first_of("=&"));
  if (query.empty()) return std::nullopt;
  return Refusal(400, "There is no query parameter \"" + std::string(name) + "\"; parameters are sent in the body.");
}

// The answer to OPTIONS (RFC 9110, 9.3.7).
Response Options(const std::string& allowed) {
  Response response;
  response.status = 204;
  response.headers.emplace_back("Allow", allowed + ", OPTIONS");
  return response;
}

// Answers a request for a method that is not made with POST.
std::optional<Response> RefuseOtherThanPost(const Head& head) {
  if (head.method == "OPTIONS") return Options("POST");
  if (head.method != "POST") return MethodNotAllowed(head.target, "POST");
  return std::nullopt;
}

// Answers a request for a resource that is not made with GET or HEAD, or that has a query.
std::optional<Response> RefuseOtherThanGet(const Head& head) {
  if (head.method == "OPTIONS") return Options("GET, HEAD");
  if (head.method != "GET" && head.method != "HEAD") return MethodNotAllowed(head.target, "GET, HEAD");
  return RefuseQuery(head.query);
}

constexpr std::string_view kRehearse = "rehearse=true";

// Refuses a call with a query, except one that asks for the rehearsal of a module's changing method.
std::optional<Response> RefuseQueryOfCall(std::string_view query, const Route& route) {
  if (query.substr(0, query.find_first_of("=&")) != "rehearse") return RefuseQuery(query);
  if (query != kRehearse)
    return Refusal(400, "A rehearsal is asked for with the query rehearse=true, and no other one.");
  if (route.own) return Refusal(400, "The methods of the server itself cannot be rehearsed.");
  if (route.method.reads_only) return Refusal(400, "Only a method that changes something can be rehearsed.");
  return std::nullopt;
}

// An answer that depends only on the program's version. Clients may cache it and revalidate it.
Response Unchanging(Response response) {
  const std::string version = std::to_string(std::hash<std::string>()(response.body));
  response.headers.emplace_back("ETag", "W/\"" + version + "\"");
  response.headers.emplace_back("Cache-Control", "no-cache");
  return response;
}

// A page without scripts; a browser loads nothing for it but the style sheet.
Response File(std::string_view content, std::string_view type) {
  Response response;
  response.body = content;
  response.content_type = type;
  response.headers.emplace_back("Content-Security-Policy",
                                "default-src 'none'; style-src 'self'; base-uri 'none'; "
                                "form-action 'none'; frame-ancestors 'none'");
  return response;
}

}  // namespace

// The resources beside the methods. The network thread answers them, so it answers "/healthz" and "/healthz/live" as
// long as the process is alive; "/healthz/ready" and "/metrics" ask the workers.
const std::array<WebApi::Page, 8> WebApi::kPages = {{{"/api", false, &WebApi::List},
                                                     {"/openapi.json", true, &WebApi::OpenApi},
                                                     {"/docs", true, &WebApi::Docs},
                                                     {"/docs.css", true, &WebApi::DocsStyle},
                                                     {"/healthz", true, &WebApi::Alive},
                                                     {"/healthz/live", true, &WebApi::Alive},
                                                     {"/healthz/ready", true, &WebApi::Ready},
                                                     {"/metrics", false, &WebApi::Metrics}}};

WebApi::WebApi(Parts parts) : WebApi(parts, Limits{}) {}
WebApi::WebApi(Parts parts, Limits limits)
    : parts_(parts),
      limits_(limits),
      list_(Unchanging(Success(parts.routes.List()))),
      docs_(Unchanging(File(kDocsPage, "text/html; charset=utf-8"))),
      docs_style_(Unchanging(File(kDocsStyle, "text/css; charset=utf-8"))) {}

std::variant<std::shared_ptr<Exchange>, Response> WebApi::Begin(const Head& head) {
  if (auto refusal = KeepOtherSitesOut(head, parts_.names)) return *std::move(refusal);
  if (head.target == "*" && head.method == "OPTIONS") return Options("GET, HEAD, POST");
  if (head.target == kSignInPath) return BeginSignIn(head);
  const auto* page =
      std::find_if(kPages.begin(), kPages.end(), [&head](const Page& each) { return each.path == head.target; });
  if (page == kPages.end()) page = nullptr;
  if (page != nullptr && page->is_public) return BeginPage(*page, head);
  if (parts_.console.Owns(head.target)) return BeginConsole(head);
  const CallerPtr caller =
      parts_.authenticator.Identify(head, parts_.names.AreSecure(head.host.value_or(""), head.secure));
  if (!caller) return Unauthenticated("Sign in first, or send a valid token.");
  Begun begun = BeginFor(caller, page, head);
  if (auto* answer = std::get_if<Response>(&begun)) answer->caller = caller->name;
  return begun;
}

WebApi::Begun WebApi::BeginFor(const CallerPtr& caller, const Page* page, const Head& head) const {
  if (page != nullptr) return BeginPage(*page, head);
  std::string unknown;
  const Route* route = parts_.routes.Find(head.target, &unknown);
  if (route == nullptr) return Refusal(404, unknown);
  if (auto refusal = RefuseOtherThanPost(head)) return *std::move(refusal);
  if (auto refusal = RefuseQueryOfCall(head.query, *route)) return *std::move(refusal);
  if (auto refusal = RefuseCaller(*caller, *route, !head.query.empty())) return *std::move(refusal);
  return BeginCall(*route, caller, head);
}

WebApi::Begun WebApi::BeginCall(const Route& route, const CallerPtr& caller, const Head& head) const {
  NewBody body = OpenBody(head, route, parts_);
  if (auto* refusal = std::get_if<Response>(&body)) return std::move(*refusal);
  Call::Request request{route,
                        caller,
                        head.peer.address,
                        IfMatchOf(head),
                        TurnOf(head.peer, caller->name),
                        head.recent_requests,
                        head.query == kRehearse};
  if (request.if_match && route.shown_by == nullptr) {
    return Refusal(400, "This method accepts no If-Match: no ETag stands for what it changes.");
  }
  // A rehearsal takes no lock, so it must not wait for changing calls that wait for one.
  const bool only_reads = route.method.reads_only || request.rehearses;
  WorkerPool& pool = only_reads ? parts_.workers.reading : parts_.workers.changing;
  std::get<std::unique_ptr<Body>>(body)->Announce(head.content_length);
  return std::make_shared<Call>(std::move(request), std::get<std::unique_ptr<Body>>(std::move(body)),
                                Call::Environment{pool, parts_.audit, parts_.metrics, limits_.call});
}

WebApi::Begun WebApi::BeginSignIn(const Head& head) const {
  if (auto refusal = RefuseOtherThanPost(head)) return *std::move(refusal);
  if (auto refusal = RefuseQuery(head.query)) return *std::move(refusal);
  const std::optional<HeaderValue> type = ParseHeaderValue(head.content_type);
  if (!type || type->value != "application/json" || !IsUtf8(*type)) {
    return Refusal(415, "Signing in takes its parameters as application/json, in UTF-8.");
  }
  if (head.content_length > SignInCall::kMaxBytes) return SignInCall::TooLarge();
  return std::make_shared<SignInCall>(parts_.sign_in, head.peer,
                                      parts_.names.AreSecure(head.host.value_or(""), head.secure));
}

Response WebApi::Refuse(int status, std::string_view text) const { return Refusal(status, text); }

WebApi::Begun WebApi::BeginPage(const Page& page, const Head& head) const {
  if (auto refusal = RefuseOtherThanGet(head)) return *std::move(refusal);
  return (this->*page.begin)(head);
}

WebApi::Begun WebApi::BeginConsole(const Head& head) const {
  if (auto refusal = RefuseOtherThanGet(head)) return *std::move(refusal);
  return parts_.console.Get(head);
}

WebApi::Begun WebApi::List(const Head& /*head*/) const { return list_; }

WebApi::Begun WebApi::OpenApi(const Head& /*head*/) const {
  if (!open_api_) open_api_ = Unchanging(File(WriteJson(OpenApiDocument(parts_.routes)), "application/json"));
  return *open_api_;
}

WebApi::Begun WebApi::Docs(const Head& /*head*/) const { return docs_; }
WebApi::Begun WebApi::DocsStyle(const Head& /*head*/) const { return docs_style_; }

WebApi::Begun WebApi::Alive(const Head& /*head*/) const { return Success(Json::Value()); }

WebApi::Begun WebApi::Ready(const Head& head) const {
  static const char page = 0;
  return MakeOnWorker(&page, head, limits_.ready, [] { return Success(Json::Value()); });
}

WebApi::Begun WebApi::Metrics(const Head& head) const {
  static const char page = 0;
  // The page may be made when this object is gone; the parts live longer than the workers.
  return MakeOnWorker(&page, head, limits_.call,
                      [&calls = parts_.metrics, &workers = parts_.workers, &figures = parts_.figures] {
                        Response response{200, WriteMetrics(calls, workers, figures)};
                        response.content_type = "text/plain; version=0.0.4; charset=utf-8";
                        return response;
                      });
}

// The page is identified by the address.
WebApi::Begun WebApi::MakeOnWorker(const void* page, const Head& head, std::chrono::milliseconds time,
                                   std::function<Response()> make) const {
  WorkerPage::Request request{page, TurnOf(head.peer, ""), head.recent_requests};
  return std::make_shared<WorkerPage>(parts_.workers.reading, std::move(request), time, std::move(make));
}

}  // namespace vorn::server
