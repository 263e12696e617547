#include "agentd/routes/Dispatch.h"

#include <string>
#include <utility>

#include "agentd/tasks/QueryQueue.h"
#include "agentd/tasks/TaskQueue.h"
#include "host/ManagementApi.h"
#include "host/RequestBounds.h"

namespace Agentd {
namespace {

using Nox::OperationDescriptor;
using Nox::Operation::Change;
using Nox::Operation::Query;

// What `make` makes. An answer that cannot be made is the host's mistake, and still an answer.
template <class Make>
HttpAnswer Answered(const Encoding& encoding, const Make& make) {
  try {
    return make();
  } catch (const Orbis::MethodFault::Exception& refused) {
    return encoding.fault({.result = nullptr, .fault = refused.GetFault()});
  } catch (const std::exception& mistake) {
    return encoding.fault(Host::FailedWith(mistake.what()));
  }
}

void Ask(const Services& services, const OperationDescriptor& operation, const RequestRef& request,
         const Encoding& encoding, const HttpResponder& responder) {
  services.queries.Run([api = services.api, &operation, request, encoding, responder] {
    Host::Outcome outcome = Host::Outcome::Failed;  // of what comes to no answer that can be made
    HttpAnswer made = Answered(encoding, [&] {
      const Host::Answer answer = api->Query(static_cast<const Query&>(*request));
      HttpAnswer http = encoding.answer(operation, answer);
      outcome = Host::OutcomeOfQuery(answer);
      return http;
    });
    responder.Answer(std::move(made));
    return outcome;
  });
}

void Submit(const Services& services, const OperationDescriptor& operation, const RequestRef& request,
            const Encoding& encoding, const HttpResponder& responder) {
  const auto& change = static_cast<const Change&>(*request);
  const bool waits = !change.HasWait() || change.GetWait();
  TaskQueue::Listener onEnded;
  if (waits) {
    onEnded = [encoding, responder](const Task& ended) {
      responder.Answer(Answered(encoding, [&] { return encoding.ended(ended); }));
    };
  }
  const Task task = services.tasks.Submit(
      std::string(operation.name), change.HasLabel() ? change.GetLabel() : "",
      [api = services.api, request] { return api->Change(std::move(static_cast<Change&>(*request))); },
      std::move(onEnded), Host::WeightOf(*request));
  if (!waits) {
    responder.Answer(encoding.takenOn(task));
  }
}

}  // namespace

void Dispatch(const Services& services, const OperationDescriptor& operation, const RequestRef& request,
              const Encoding& encoding, const HttpResponder& responder) {
  Host::BoundRequest(*request);
  if (operation.changes) {
    Submit(services, operation, request, encoding, responder);
  } else {
    Ask(services, operation, request, encoding, responder);
  }
}

}  // namespace Agentd
