#include "agentd/routes/Routes.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <exception>
#include <optional>
#include <string>
#include <utility>

#include "agentd/http/HttpTarget.h"
#include "agentd/routes/Dispatch.h"
#include "agentd/routes/DoorMetrics.h"
#include "agentd/routes/HostWatch.h"
#include "agentd/routes/JsonAnswers.h"
#include "agentd/routes/Metrics.h"
#include "agentd/routes/Permission.h"
#include "agentd/routes/Refusals.h"
#include "agentd/routes/RequestReader.h"
#include "agentd/routes/SoapAnswer.h"
#include "agentd/routes/SoapEndpoint.h"
#include "agentd/tasks/TaskApi.h"
#include "agentd/tasks/TaskQueue.h"
#include "host/Build.h"
#include "host/Gate.h"
#include "host/HostError.h"
#include "host/ManagementApi.h"
#include "nox/Documents.h"
#include "nox/Operations.h"
#include "orbis/ParseException.h"
#include "tessa/text/Escape.h"

namespace Agentd {
namespace {

using Host::ManagementApi;

constexpr std::string_view jsonType = "application/json";
constexpr std::string_view xmlType = "text/xml";
constexpr std::string_view jsonFolder = "/api/v1";  // whoever may throw is below it
constexpr std::size_t readersBody = 1 << 20;        // of those who may not change

// A request on its way: who serves it, what was asked, and the way back. Gone when it is served; an answer
// that comes later keeps what it needs.
struct Call {
  Services services;
  const Metrics& metrics;
  HostWatch& watch;
  const std::function<HttpLoad()>& load;
  const HttpTarget& target;
  const HttpRequest& request;
  const HttpResponder& responder;
  std::string_view rest;  // of the path, behind the route's
};

void Refuse(const Call& call, unsigned status, const std::string& reason, const std::string& argument = {}) {
  call.responder.Answer(RefusalAt(call.target.path, status, reason, argument));
}

// Refuses every parameter of the target but `known`. Whether the request may go on.
bool HasOnly(std::string_view known, const Call& call) {
  for (const auto& [name, value] : call.target.parameters) {
    if (name != known) {
      Refuse(call, 400,
             "unknown parameter '" + Tessa::EscapeToAscii(name) + "'" +
                 (known.empty() ? "; there are none here" : "; wanted '" + std::string(known) + "'"),
             Tessa::EscapeToAscii(name));
      return false;
    }
  }
  return true;
}

// Answers for a request that cannot be read, or must not be carried out.
HttpAnswer Refused(const std::exception_ptr& reason) {
  try {
    std::rethrow_exception(reason);
  } catch (const Orbis::ParseException& refused) {
    return RefusalAt(jsonFolder, refused);
  } catch (const Orbis::MethodFault::Exception& refused) {
    return ToHttp(Host::Answer{.result = nullptr, .fault = refused.GetFault()});
  } catch (const std::exception& mistake) {
    return ToHttp(Host::FailedWith(mistake.what()));
  }
}

void Health(const Call& call) {
  std::string text = "ok";
  if (call.request.peer.role >= HttpRole::Read) {  // what it is, strangers need not know
    text += "\nagentd " + Host::VersionLine();
  }
  call.responder.Answer(PlainText(200, text));
}

void GetMetrics(const Call& call) {
  if (!HasOnly("", call)) {
    return;
  }
  const TaskQueue::Load changes = call.services.tasks.Now();
  call.responder.Answer(
      {200, "text/plain; version=0.0.4; charset=utf-8",
       call.metrics.Text(
           {.changes = changes, .queries = call.services.queries.Now(), .host = call.watch.Last()}) +
           DescribeDoors(call.load())});
  call.watch.Refresh(changes.ended.Total());  // for the next who asks: this answer waits for nobody
}

void Dispatch(const Call& call, const RequestRef& request) {
  Dispatch(call.services, Nox::OperationOf(*request), request, JsonEncoding(), call.responder);
}

void GetDisks(const Call& call) {
  if (HasOnly("names", call)) {
    const auto request = Tessa::MakeRef<Nox::Operation::QueryDisksForKova>();
    request->SetNames(Tessa::MakeRef<Orbis::TextList>(call.target.ValuesOf("names")));
    Dispatch(call, request);
  }
}

template <class Query>
void GetPlain(const Call& call) {
  if (HasOnly("", call)) {
    Dispatch(call, Tessa::MakeRef<Query>());
  }
}

void PostOperation(const Call& call) {
  Dispatch(call, ReadJsonRequest(*Nox::FindOperation(call.rest), call.request.body));
}

void GetTasks(const Call& call) {
  if (HasOnly("", call)) {
    call.responder.Answer(DescribeTasks(call.services.tasks.List()));
  }
}

void GetTask(const Call& call) {
  if (const std::optional<Task> task = call.services.tasks.Find(std::string(call.rest))) {
    call.responder.Answer(DescribeTask(200, *task));
  } else {
    Refuse(call, 404, std::string(noSuchTask));
  }
}

void GetHost(const Call& call) {
  if (!HasOnly("", call)) {
    return;
  }
  try {
    call.responder.Answer({200, std::string(jsonType), call.services.api->DescribeHost()});
  } catch (const Host::HostError& unknown) {
    Refuse(call, 404, unknown.what());
  }
}

// A task like any other: nothing changes the host while a request is at work on it.
void PostHost(const Call& call) {
  call.services.api->CheckHostChange(call.request.body);
  call.services.tasks.Submit(
      "ChangeHost", "",
      [api = call.services.api, change = call.request.body] { return api->ChangeHost(change); },
      [responder = call.responder](const Task& ended) { responder.Answer(ToHttp(ended)); },
      call.request.body.size());
}

void GetDescription(const Call& call) {
  if (HasOnly("", call)) {
    call.responder.Answer({200, std::string(jsonType), std::string(Nox::OpenApiText())});
  }
}

void PostSoap(const Call& call) {
  ServeSoap(call.services, call.request, call.responder);
}

void GetSoap(const Call& call) {
  call.responder.Answer(DescribeService(call.request, call.target));
}

bool IsNothing(std::string_view rest) {
  return rest.empty();
}

bool IsId(std::string_view rest) {
  return !rest.empty();
}

bool IsOperation(std::string_view rest) {
  return Nox::FindOperation(rest) != nullptr;
}

struct Route {
  HttpRole role;              // what it takes; an operation may take more
  std::string_view bodyType;  // what a POST must be; empty for a GET
  std::string_view path;
  bool (*takes)(std::string_view rest);  // what stands behind the path
  void (*serve)(const Call& call);
};

constexpr std::array<Route, 13> routes = {{
    {HttpRole::None, "", "/healthz", &IsNothing, &Health},
    {HttpRole::Read, "", "/metrics", &IsNothing, &GetMetrics},
    {HttpRole::Read, "", "/api/v1/disks", &IsNothing, &GetDisks},
    {HttpRole::Read, "", "/api/v1/groups", &IsNothing, &GetPlain<Nox::Operation::GetDiskGroups>},
    {HttpRole::Read, "", "/api/v1/config", &IsNothing, &GetPlain<Nox::Operation::GetConfigInfo>},
    {HttpRole::Read, "", "/api/v1/openapi.json", &IsNothing, &GetDescription},
    {HttpRole::Read, "", "/api/v1/tasks", &IsNothing, &GetTasks},
    {HttpRole::Read, "", "/api/v1/tasks/", &IsId, &GetTask},
    {HttpRole::Read, "", "/api/v1/host", &IsNothing, &GetHost},
    {HttpRole::Change, jsonType, "/api/v1/host", &IsNothing, &PostHost},
    {HttpRole::None, jsonType, "/api/v1/", &IsOperation, &PostOperation},
    {HttpRole::Read, "", "/soap", &IsNothing, &GetSoap},
    {HttpRole::Read, xmlType, "/soap", &IsNothing, &PostSoap},
}};

bool Matches(const Route& route, std::string_view path) {
  return path.substr(0, route.path.size()) == route.path && route.takes(path.substr(route.path.size()));
}

// A content type is demanded of every body: a form of a stranger's page cannot send this one.
bool IsOfType(std::string_view wanted, std::string_view contentType) {
  std::string type(contentType.substr(0, contentType.find(';')));
  type.erase(type.find_last_not_of(" \t") + 1);
  std::transform(type.begin(), type.end(), type.begin(), [](char byte) {
    return byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte - 'A' + 'a') : byte;
  });
  return type == wanted;
}

HttpRole RoleFor(const Route& route, std::string_view rest) {
  const auto* const operation = route.takes == &IsOperation ? Nox::FindOperation(rest) : nullptr;
  return operation == nullptr ? route.role : operation->changes ? HttpRole::Change : HttpRole::Read;
}

void ServeRoute(const Route& route, const Call& call) {
  try {
    route.serve(call);
  } catch (...) {
    call.responder.Answer(Refused(std::current_exception()));
  }
}

// Of the route, for people who count: an operation stands with its name, a task without its id.
std::string NameOf(const Route& route, std::string_view rest) {
  return std::string(route.path) + (route.takes == &IsOperation ? std::string(rest) : "");
}

// Where a request leads, as far as its header tells. It looks into the target.
struct RouteMatch {
  const Route* route = nullptr;
  std::string_view rest = {};
  std::string name = "none";
  std::optional<HttpAnswer> refusal = std::nullopt;
};

// The route of that method; otherwise, what else is served there.
const Route* FindRoute(std::string_view method, std::string_view path, std::string& allow) {
  for (const Route& route : routes) {
    if (!Matches(route, path)) {
      continue;
    }
    const bool isGet = route.bodyType.empty();
    if (isGet ? method == "GET" || method == "HEAD" : method == "POST") {
      return &route;
    }
    allow += allow.empty() ? "" : ", ";
    allow += isGet ? "GET, HEAD" : "POST";
  }
  return nullptr;
}

HttpAnswer NotServed(std::string_view path, const std::string& allow) {
  if (allow.empty()) {
    return RefusalAt(path, 404, "nothing is served here");
  }
  HttpAnswer refusal = RefusalAt(path, 405, "that method is not served here");
  refusal.allow = allow;
  return refusal;
}

std::optional<HttpAnswer> RefusalOn(const Route& route, std::string_view rest, const HttpRequest& head) {
  if (const auto refusal = RefusalOf(head, RoleFor(route, rest))) {
    return route.bodyType == xmlType ? ToSoapFault(*refusal) : ToHttp(*refusal);
  }
  if (!route.bodyType.empty() && !IsOfType(route.bodyType, head.contentType)) {
    return RefusalAt(head.target, 415, "the body must be " + std::string(route.bodyType));
  }
  return std::nullopt;
}

RouteMatch MatchRoute(const HttpRequest& head, const std::optional<HttpTarget>& target) {
  if (!target) {
    return {.refusal = RefusalAt(head.target, 400, "the target holds a broken escape")};
  }
  std::string allow;
  const Route* const route = FindRoute(head.method, target->path, allow);
  if (route == nullptr) {
    return {.refusal = NotServed(target->path, allow)};
  }
  const std::string_view rest = std::string_view(target->path).substr(route->path.size());
  return {route, rest, NameOf(*route, rest), RefusalOn(*route, rest, head)};
}

std::size_t MostBodyOf(HttpRole role) {
  return role == HttpRole::Change ? HttpAdmission().bodyBytes : role == HttpRole::Read ? readersBody : 0;
}

// Counts the answer on its way.
HttpResponder Counted(const std::shared_ptr<Metrics>& metrics, std::string route,
                      const HttpResponder& responder) {
  using Clock = std::chrono::steady_clock;
  return HttpResponder(
      [metrics, route = std::move(route), responder, begun = Clock::now()](HttpAnswer answer) {
        metrics->Count(route, answer.status, Clock::now() - begun);
        responder.Answer(std::move(answer));
      });
}

}  // namespace

Router::Router(const ManagementApi& api, TaskQueue& tasks, const QueryLimits& limits)
    : _tasks(tasks),
      _api(std::make_shared<TaskApi>(api, tasks)),
      _queries(std::make_unique<QueryQueue>(limits)),
      _watch(std::make_unique<HostWatch>(api, *_queries)),
      _metrics(std::make_shared<Metrics>()) {}
Router::~Router() = default;

bool Router::WaitUntilIdle(std::chrono::milliseconds patience) const {
  return _queries->WaitUntilIdle(patience);
}

HttpAdmission Router::Admit(const HttpRequest& head) const {
  RouteMatch match = MatchRoute(head, ParseTarget(head.target));
  if (match.refusal) {
    _metrics->Count(match.name, match.refusal->status, {});
  }
  return {std::move(match.refusal), MostBodyOf(head.peer.role)};
}

void Router::Serve(const HttpRequest& request, const HttpResponder& responder) const {
  const std::optional<HttpTarget> target = ParseTarget(request.target);
  const RouteMatch match = MatchRoute(request, target);
  const HttpResponder counted = Counted(_metrics, match.name, responder);
  if (match.refusal) {
    counted.Answer(*match.refusal);
  } else {
    ServeRoute(*match.route,
               {{_api, _tasks, *_queries}, *_metrics, *_watch, _load, *target, request, counted, match.rest});
  }
}

}  // namespace Agentd
