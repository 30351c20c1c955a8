#include "Sandbox/Servers.h"

#include <httplib.h>

#include <cstdio>
#include <functional>
#include <stdexcept>
#include <thread>
#include <utility>

#include "Host/Json/Json.h"
#include "Sandbox/FaultyAnswer.h"
#include "Sandbox/Form.h"
#include "Sandbox/TlsServer.h"

namespace palisade::sandbox {
namespace {

constexpr std::size_t mostConnections = 64;
constexpr std::size_t mostRequestsAConnection = 1'000'000;
constexpr std::size_t largestForm = 1'000'000;
constexpr int idleSeconds = 600;
constexpr long longestAge = 1'000L * 3600 * 24 * 365 * 10;  // milliseconds

constexpr const char* bearer = "Bearer ";
constexpr const char* jsonType = "application/json";

std::optional<std::string> tokenOf(const httplib::Request& request) {
  const std::string authorization = request.get_header_value("Authorization");
  if (!authorization.starts_with(bearer)) return std::nullopt;
  return authorization.substr(std::string_view(bearer).size());
}

Permissions permissionsIn(const Form& form) {
  Permissions permissions;
  const auto [first, last] = form.equal_range("permissions");
  for (auto permission = first; permission != last; ++permission) permissions.insert(permission->second);
  return permissions;
}

Form readForm(const httplib::ContentReader& reader) {
  std::string body;
  reader([&body](const char* bytes, std::size_t size) {
    body.append(bytes, size);
    return body.size() <= largestForm;
  });
  return parseForm(body);
}

void fill(httplib::Response& response, const Answer& answer) {
  response.status = answer.status;
  if (answer.body) response.set_content(writeJson(*answer.body), jsonType);
}

// Whether the fault is a proper answer that says no.
bool isRefusal(FaultKind kind) {
  return kind == FaultKind::redirect || kind == FaultKind::unavailable || kind == FaultKind::status;
}

Answer refuse(const Fault& fault, httplib::Response& response) {
  if (!fault.location.empty()) response.set_header("Location", fault.location);
  if (!fault.retryAfter.empty()) response.set_header("Retry-After", fault.retryAfter);
  return errorAnswer(fault.status, "fault", "The sandbox was told to answer " + std::to_string(fault.status) + ".");
}

std::string wholeAnswer(const Answer& answer) {
  const std::string body = answer.body ? writeJson(*answer.body) : std::string();
  return "HTTP/1.1 " + std::to_string(answer.status) + " Sandbox\r\nContent-Type: " + jsonType +
         "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

std::unique_ptr<httplib::Server> makeServer(const Authority& authority, CertificateKind kind) {
  auto server = kind == CertificateKind::plain ? std::make_unique<httplib::Server>()
                                               : std::make_unique<TlsServer>([&authority, kind](SSL_CTX& context) {
                                                   authority.prepare(context, kind);
                                                   return true;
                                                 });
  server->new_task_queue = [] { return new httplib::ThreadPool(mostConnections); };
  server->set_keep_alive_max_count(mostRequestsAConnection);
  server->set_keep_alive_timeout(idleSeconds);
  server->set_tcp_nodelay(true);
  return server;
}

Listener listen(std::unique_ptr<httplib::Server> server, int port) {
  int listening = -1;
  server->set_socket_options([&listening](int made) {
    // A port may be taken again at once after a restart, but never by two servers.
    const int yes = 1;
    setsockopt(made, SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes);
    listening = made;
  });
  Listener listener;
  constexpr const char* loopback = "127.0.0.1";
  listener.port = port == 0 ? server->bind_to_any_port(loopback) : (server->bind_to_port(loopback, port) ? port : -1);
  if (listener.port < 0) throw std::runtime_error("Cannot listen on port " + std::to_string(port) + " of " + loopback + ".");
  // The library lets five clients wait, and the sixth tries again after a second.
  ::listen(listening, mostConnections);
  // Serves until the process ends.
  std::thread([serving = server.get()] { serving->listen_after_bind(); }).detach();
  listener.server = std::move(server);
  return listener;
}

// One listener's routes: each logs its request, meets a fault if one is armed, and answers.
class Routes {
 public:
  using Action = std::function<Answer(const std::optional<std::string>& token, const Form& form)>;

  Routes(httplib::Server& server, Faults& faults, RequestLog& log) : _server(server), _faults(faults), _log(log) {}

  void post(const std::string& path, Action action) {
    _server.Post(path, [this_ = *this, action = std::move(action)](const httplib::Request& request, httplib::Response& response,
                                                                   const httplib::ContentReader& reader) {
      this_.serve(request, readForm(reader), response, action);
    });
  }

  void get(const std::string& path, Action action) {
    _server.Get(path,
                [this_ = *this, action = std::move(action)](const httplib::Request& request, httplib::Response& response) {
                  this_.serve(request, {}, response, action);
                });
  }

 private:
  void serve(const httplib::Request& request, const Form& form, httplib::Response& response, const Action& action) const {
    LoggedRequest logged = {
        .method = request.method, .path = request.path, .isSigned = tokenOf(request).has_value(), .port = request.remote_port};
    for (const auto& [name, value] : form) logged.fields.insert(name);

    const std::optional<Fault> fault = request.ssl == nullptr ? std::nullopt : _faults.take(request.path);
    // A request whose answer goes wrong has been carried out all the same: clients have to bear that.
    const Answer answer = fault && isRefusal(fault->kind) ? refuse(*fault, response) : action(tokenOf(request), form);
    fill(response, answer);

    logged.status = answer.status;
    if (answer.body && answer.body->dictionary() != nullptr) {
      for (const auto& [name, value] : *answer.body->dictionary()) logged.members.insert(name);
    }
    std::fprintf(stderr, "%s %s %d%s\n", logged.method.c_str(), logged.path.c_str(), logged.status,
                 fault ? " with a fault" : "");
    _log.add(std::move(logged));

    if (!fault || isRefusal(fault->kind)) return;
    RawConnection connection(*const_cast<SSL*>(request.ssl));
    answerWithFault(*fault, wholeAnswer(answer), connection);
  }

  httplib::Server& _server;
  Faults& _faults;
  RequestLog& _log;
};

}  // namespace

Listener::Listener() = default;
Listener::Listener(Listener&&) noexcept = default;
Listener::~Listener() = default;

Listener listenAsFacebook(const Authority& authority, CertificateKind kind, int port, TokenOffice& office, Faults& faults,
                          RequestLog& log) {
  auto server = makeServer(authority, kind);
  Routes routes(*server, faults, log);
  routes.post("/oauth/authorization", [&office](const auto& token, const Form& form) {
    return office.authorize(token, {.appID = field(form, "app_id"),
                                    .bundleID = field(form, "bundle_id"),
                                    .permissions = permissionsIn(form),
                                    .audience = field(form, "audience")});
  });
  routes.post("/oauth/permission-description",
              [&office](const auto& token, const Form& form) { return office.describe(token, permissionsIn(form)); });
  routes.post("/oauth/invalidation", [&office](const auto& token, const Form& form) {
    return office.invalidate(token, field(form, "app_id"), std::chrono::milliseconds(number(form, "age", 0, longestAge)));
  });
  routes.get("/me", [&office](const auto& token, const Form&) { return office.me(token); });
  return listen(std::move(server), port);
}

Listener listenForControl(const Authority& authority, const std::string& secret, TokenOffice& office, Faults& faults,
                          RequestLog& log) {
  auto server = makeServer(authority, CertificateKind::good);
  server->set_pre_routing_handler([secret](const httplib::Request& request, httplib::Response& response) {
    if (tokenOf(request) == secret) return httplib::Server::HandlerResponse::Unhandled;
    fill(response,
         errorAnswer(403, "forbidden", "Only who may read the file control-secret in the sandbox's directory is served."));
    response.set_header("Connection", "close");
    return httplib::Server::HandlerResponse::Handled;
  });
  server->Get("/tokens", [&office](const auto&, auto& response) { fill(response, office.issued()); });
  server->Get("/requests", [&log](const auto&, auto& response) { fill(response, {.body = log.requests()}); });
  server->Get("/faults", [&faults](const auto&, auto& response) { fill(response, {.body = faults.armed()}); });
  server->Post("/faults", [&faults](const auto&, auto& response, const httplib::ContentReader& reader) {
    const std::optional<Fault> fault = faultFromForm(readForm(reader));
    if (!fault) {
      fill(response, errorAnswer(400, "unknown_fault", "There is no such fault."));
      return;
    }
    faults.arm(*fault);
    fill(response, {.body = faults.armed()});
  });
  server->Post("/calm", [&faults](const auto&, auto& response, const httplib::ContentReader& reader) {
    readForm(reader);
    faults.calm();
    fill(response, {.body = faults.armed()});
  });
  return listen(std::move(server), 0);
}

}  // namespace palisade::sandbox
