#include "otxctl/fault/RecordingProvider.h"

#include <utility>

#include "otxctl/provider/NamedException.h"

namespace OtxCtl::Fault {
namespace {

using HostCtl::Kova::FormatContext;
using HostCtl::Kova::RemovalOptions;
using nlohmann::json;

// Built element by element: a brace list of texts could be taken for an object.
template <typename... Values>
json ArrayOf(const Values&... values) {
  json array = json::array();
  (array.push_back(json(values)), ...);
  return array;
}

json ToJson(bool flag) {
  return flag;
}

json ToJson(const std::string& text) {
  return text;
}

json ToJson(const std::vector<std::string>& names) {
  return names;
}

json ToJson(const FormatContext& context) {
  return ArrayOf(context.requestTag, context.mappingCount, context.mappingIndex);
}

json ToJson(const RemovalOptions& options) {
  return ArrayOf(options.text, options.first, options.second);
}

json ArgumentsOf(const Provider::ProviderCall& call) {
  json arguments = json::array();
  for (const Provider::Input& input : call.inputs) {
    arguments.push_back(std::visit([](const auto& given) { return ToJson(given); }, input));
  }
  return arguments;
}

}  // namespace

RecordingProvider::RecordingProvider(std::shared_ptr<HostCtl::Kova::KovaInfo> target,
                                     std::shared_ptr<CallRecorder> recorder)
    : ForwardingProvider(std::move(target)), _recorder(std::move(recorder)) {}

void RecordingProvider::AroundCall(const Provider::ProviderCall& call, const Forward& forward) {
  FaultEffect effect;
  const std::uint64_t ticket = _recorder->Begin(call.operation, ArgumentsOf(call), effect);
  try {
    ApplyEffect(effect);
    forward();
    _recorder->End(ticket, "ok");
  } catch (const std::exception& failure) {
    _recorder->End(ticket, std::string(Provider::ExceptionName(failure)) + ": " + failure.what());
    throw;
  }
}

}  // namespace OtxCtl::Fault
