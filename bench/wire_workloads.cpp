// The wire: encoding and decoding the snapshot tree and a full location as SOAP
// values, side by side with protobuf's binary and JSON forms of the twin messages.
// Every workload reports the bytes of one message; decoding reports allocations
// per tree node.
#include <google/protobuf/util/json_util.h>

#include <string>

#include "bench.h"
#include "orbit/wire/Codec.h"
#include "twins.h"

namespace TarnBench {
namespace {

namespace pb = ::tarnbench;
using Kernite::Ref;

const Orbit::Wire::Codec& WireCodec() {
    static const Orbit::Wire::Codec codec(*Orbit::GetVersionMap()->GetVersion("tarn.version.dev"));
    return codec;
}

// The tree for a node count, or the location for 0.
Ref<Orbit::Any> OurValue(int n) {
    if (n == 0) return Ref<Orbit::Any>(MakeLocation());
    return Ref<Orbit::Any>(MakeVmState(n));
}

void FillTwin(google::protobuf::Message* message, int n) {
    if (n == 0) FillLocation(static_cast<pb::VmLocation*>(message));
    else FillVmState(static_cast<pb::VmState*>(message), n);
}

std::unique_ptr<google::protobuf::Message> NewTwin(int n) {
    if (n == 0) return std::make_unique<pb::VmLocation>();
    return std::make_unique<pb::VmState>();
}

void Report(benchmark::State& state, std::size_t bytes) {
    state.counters["bytes"] = static_cast<double>(bytes);
}

void BM_wire_encode(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    const Ref<Orbit::Any> value = OurValue(n);
    const std::string xml = WireCodec().EncodeValue(value.Get());
    if (!value->_IsEqual(WireCodec().DecodeValue(xml).Get())) return Fail(state, "the value does not come back");
    for (auto _ : state) {
        std::string text = WireCodec().EncodeValue(value.Get());
        benchmark::DoNotOptimize(text.data());
    }
    Report(state, xml.size());
}

void BM_wire_decode(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    const Ref<Orbit::Any> value = OurValue(n);
    const std::string xml = WireCodec().EncodeValue(value.Get());
    if (!value->_IsEqual(WireCodec().DecodeValue(xml).Get())) return Fail(state, "the value does not come back");
    AllocationCount allocations(state);
    for (auto _ : state) {
        Ref<Orbit::Any> back = WireCodec().DecodeValue(xml);
        benchmark::DoNotOptimize(back.Get());
    }
    allocations.Report(1.0, n);
    Report(state, xml.size());
}

void BM_binary_encode(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    auto source = NewTwin(n);
    FillTwin(source.get(), n);
    std::string bytes;
    for (auto _ : state) {
        bytes.clear();
        source->SerializeToString(&bytes);
        benchmark::DoNotOptimize(bytes.data());
    }
    Report(state, bytes.size());
}

void BM_binary_decode(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    auto source = NewTwin(n);
    FillTwin(source.get(), n);
    const std::string bytes = source->SerializeAsString();
    AllocationCount allocations(state);
    for (auto _ : state) {
        auto back = NewTwin(n);
        if (!back->ParseFromString(bytes)) return Fail(state, "protobuf does not parse its own bytes");
        benchmark::DoNotOptimize(back.get());
    }
    allocations.Report(1.0, n);
    Report(state, bytes.size());
}

void BM_json_encode(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    auto source = NewTwin(n);
    FillTwin(source.get(), n);
    std::string json;
    for (auto _ : state) {
        json.clear();
        if (!google::protobuf::util::MessageToJsonString(*source, &json).ok()) return Fail(state, "no JSON");
        benchmark::DoNotOptimize(json.data());
    }
    Report(state, json.size());
}

void BM_json_decode(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    auto source = NewTwin(n);
    FillTwin(source.get(), n);
    std::string json;
    if (!google::protobuf::util::MessageToJsonString(*source, &json).ok()) return Fail(state, "no JSON");
    {
        auto back = NewTwin(n);
        if (!google::protobuf::util::JsonStringToMessage(json, back.get()).ok() ||
            back->SerializeAsString() != source->SerializeAsString())
            return Fail(state, "the JSON does not come back");
    }
    AllocationCount allocations(state);
    for (auto _ : state) {
        auto back = NewTwin(n);
        if (!google::protobuf::util::JsonStringToMessage(json, back.get()).ok()) return Fail(state, "no parse");
        benchmark::DoNotOptimize(back.get());
    }
    allocations.Report(1.0, n);
    Report(state, json.size());
}

// Arg 0 is the full location; the others are node counts of the snapshot tree.
void Sizes(benchmark::internal::Benchmark* b) { b->Arg(0)->Arg(64)->Arg(4096); }

}  // namespace

BENCHMARK(BM_wire_encode)->Name("wire/encode")->Apply(Sizes);
BENCHMARK(BM_wire_decode)->Name("wire/decode")->Apply(Sizes);
BENCHMARK(BM_binary_encode)->Name("protobuf_binary/encode")->Apply(Sizes);
BENCHMARK(BM_binary_decode)->Name("protobuf_binary/decode")->Apply(Sizes);
BENCHMARK(BM_json_encode)->Name("protobuf_json/encode")->Apply(Sizes);
BENCHMARK(BM_json_decode)->Name("protobuf_json/decode")->Apply(Sizes);

}  // namespace TarnBench
