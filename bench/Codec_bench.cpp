// SOAP texts of disks, read and written.
//
// Floors: the XML library alone over the same text, with handlers that do nothing; and the same number of
// bytes appended to a string, value by value, each looked through for what needs an escape.

#include <benchmark/benchmark.h>
#include <expat.h>

#include <memory>

#include "bench/Hosts.h"
#include "nox/Host.h"
#include "orbis/Json.h"
#include "orbis/Soap.h"
#include "orbis/xml/XmlWriter.h"

namespace {

using Disks = Orbis::DataArray<Nox::Host::ScsiDisk>;

Tessa::Ref<Disks> MakeDisks(const benchmark::State& state) {
  return Bench::DisksOf(Bench::HostWithDisks(static_cast<int>(state.range(0))));
}

std::string MakeText(const benchmark::State& state) {
  std::string text;
  Orbis::SerializeObjectToSoap(*MakeDisks(state), nullptr, text);
  return text;
}

void Count(benchmark::State& state, std::size_t bytes) {
  state.SetBytesProcessed(static_cast<std::int64_t>(bytes) * state.iterations());
}

void DecodeSoap(benchmark::State& state) {
  const std::string text = MakeText(state);
  for (auto _ : state) {
    Orbis::Ref<Orbis::Any> value;
    Orbis::DeserializeSoapToObject(text, value);
    benchmark::DoNotOptimize(value);
  }
  Count(state, text.size());
}

void DecodeSoapFloor(benchmark::State& state) {
  const std::string text = MakeText(state);
  for (auto _ : state) {
    const std::unique_ptr<XML_ParserStruct, decltype(&XML_ParserFree)> parser(
        XML_ParserCreateNS("UTF-8", '\n'), &XML_ParserFree);
    XML_SetElementHandler(
        parser.get(), [](void*, const XML_Char*, const XML_Char**) {}, [](void*, const XML_Char*) {});
    XML_SetCharacterDataHandler(parser.get(), [](void*, const XML_Char*, int) {});
    benchmark::DoNotOptimize(XML_Parse(parser.get(), text.data(), static_cast<int>(text.size()), 1));
  }
  Count(state, text.size());
}

void EncodeSoap(benchmark::State& state) {
  const auto disks = MakeDisks(state);
  std::size_t bytes = 0;
  for (auto _ : state) {
    std::string text;
    Orbis::SerializeObjectToSoap(*disks, nullptr, text);
    bytes = text.size();
    benchmark::DoNotOptimize(text);
  }
  Count(state, bytes);
}

void EncodeSoapFloor(benchmark::State& state) {
  const std::size_t size = MakeText(state).size();
  const std::string value(24, 'x');  // an ordinary value with its tag
  for (auto _ : state) {
    std::string out;
    for (std::size_t at = 0; at < size; at += value.size()) {
      Orbis::Xml::AppendText(out, value);
    }
    benchmark::DoNotOptimize(out);
  }
  Count(state, size);
}

void DecodeJson(benchmark::State& state) {
  std::string text;
  Orbis::WriteJson(*MakeDisks(state), text);
  for (auto _ : state) {
    benchmark::DoNotOptimize(Orbis::ReadJson(text, Orbis::Limits::OwnOutput(), &Disks::StaticType()));
  }
  Count(state, text.size());
}

void EncodeJson(benchmark::State& state) {
  const auto disks = MakeDisks(state);
  std::size_t bytes = 0;
  for (auto _ : state) {
    std::string text;
    Orbis::WriteJson(*disks, text);
    bytes = text.size();
    benchmark::DoNotOptimize(text);
  }
  Count(state, bytes);
}

BENCHMARK(DecodeSoap)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(DecodeSoapFloor)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(EncodeSoap)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(EncodeSoapFloor)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(DecodeJson)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(EncodeJson)->ArgName("disks")->Arg(1)->Arg(10'000);

}  // namespace
