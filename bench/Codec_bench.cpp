// SOAP texts of disks, read and written; and those of the query, turned into what clients are sent.
//
// Floors: the XML library alone over the same text, with handlers that do nothing; the same number of bytes
// appended to a string, value by value, each looked through for what needs an escape; a copy of the text.

#include <benchmark/benchmark.h>
#include <expat.h>

#include <memory>

#include "bench/Hosts.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Json.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/WrittenSoap.h"
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

// What the query of the disks answers with.
std::string MakeResults(const benchmark::State& state) {
  const auto disks = MakeDisks(state);
  Orbis::DataArray<Nox::Kova::Host::DiskResult> results;
  for (Nox::Host::ScsiDisk* disk : *disks) {
    const auto result = Tessa::MakeRef<Nox::Kova::Host::DiskResult>();
    result->SetDisk(Tessa::Ref(disk));
    result->SetState(Nox::Kova::Host::DiskResult::STATE_ELIGIBLE);
    results.Append(result);
  }
  std::string text;
  Orbis::SerializeObjectToSoap(results, nullptr, text);
  return text;
}

// `turn` must make something of the text, in a string of its own as an answer's body is.
template <class Turn>
void TurnResults(benchmark::State& state, Turn turn) {
  const std::string text = MakeResults(state);
  for (auto _ : state) {
    std::string out;
    if (!turn(text, out)) {
      state.SkipWithError("the text is not as the writer writes it");
    }
    benchmark::DoNotOptimize(out);
  }
  Count(state, text.size());
}

void TurnIntoJson(benchmark::State& state) {
  TurnResults(state,
              [](const std::string& text, std::string& out) { return Orbis::AppendJsonOfSoap(text, out); });
}

void TurnIntoMessage(benchmark::State& state) {
  const Orbis::TypeDescriptor& list = *Nox::Kova::Host::DiskResult::StaticType().array;
  TurnResults(state, [&list](const std::string& text, std::string& out) {
    return Orbis::AppendMessageOfSoap("Response", "result", list, text, out);
  });
}

void CopyOfResults(benchmark::State& state) {
  TurnResults(state, [](const std::string& text, std::string& out) {
    out = text;
    return true;
  });
}

BENCHMARK(DecodeSoap)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(DecodeSoapFloor)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(EncodeSoap)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(EncodeSoapFloor)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(DecodeJson)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(EncodeJson)->ArgName("disks")->Arg(1)->Arg(10'000);
BENCHMARK(TurnIntoJson)->ArgName("disks")->Arg(12)->Arg(512);
BENCHMARK(CopyOfResults)->Name("TurnIntoJsonFloor")->ArgName("disks")->Arg(12)->Arg(512);
BENCHMARK(TurnIntoMessage)->ArgName("disks")->Arg(12)->Arg(512);
BENCHMARK(CopyOfResults)->Name("TurnIntoMessageFloor")->ArgName("disks")->Arg(12)->Arg(512);

}  // namespace
