// Reading and writing a configuration-sized settings tree in every form,
// and reading a JSON device configuration of 1 MiB, the form every update
// starts with.
//
//   tav_bench_settings --write-documents DIR   writes the documents read
//     here (tree.xml, tree.plist, tree.json, mebibyte.json) to DIR, so that
//     bench/report can give other parsers the same text, and exits.
#include <benchmark/benchmark.h>

#include <cstring>
#include <fstream>

#include "settings/CSettingsMap.h"
#include "settings/SettingsTestTrees.h"

namespace {

// The tree of the issue: 10 000 leaves in boards of ten.
const std::shared_ptr<CSettingsMap>& Tree() {
  static const auto tree = SettingsTestTrees::Configuration(10000);
  return tree;
}

// A JSON document of at least 1 MiB of the same shape.
const std::string& MebibyteJSON() {
  static const std::string json = [] {
    int entries = 10000;
    std::string text;
    while ((text = SettingsTestTrees::Configuration(entries)->GetJSONString()).size() < (1 << 20)) {
      entries += 2000;
    }
    return text;
  }();
  return json;
}

template <typename Write>
void RunWrite(benchmark::State& state_I, Write write_I) {
  size_t size = 0;
  for (auto _ : state_I) {
    auto out = write_I(*Tree());
    size = out.size();
    benchmark::DoNotOptimize(out);
  }
  state_I.counters["bytes"] = static_cast<double>(size);
  state_I.SetBytesProcessed(static_cast<int64_t>(state_I.iterations() * size));
}

template <typename Document, typename Read>
void RunRead(benchmark::State& state_I, const Document& document_I, Read read_I) {
  for (auto _ : state_I) {
    auto tree = read_I(document_I);
    if (!tree) state_I.SkipWithError("document did not read");
    benchmark::DoNotOptimize(tree);
  }
  state_I.counters["bytes"] = static_cast<double>(document_I.size());
  state_I.SetBytesProcessed(static_cast<int64_t>(state_I.iterations() * document_I.size()));
}

void BM_WriteXML(benchmark::State& state) {
  RunWrite(state, [](const CSettingsObject& tree) { return tree.GetXMLString(""); });
}
void BM_ReadXML(benchmark::State& state) {
  RunRead(state, Tree()->GetXMLString(""), CSettingsObject::ReadFromXMLBuffer);
}
void BM_WritePList(benchmark::State& state) {
  RunWrite(state, [](const CSettingsObject& tree) { return tree.GetPListString(true); });
}
void BM_ReadPList(benchmark::State& state) {
  RunRead(state, Tree()->GetPListString(true), CSettingsObject::ReadFromXMLBuffer);
}
void BM_WriteJSON(benchmark::State& state) {
  RunWrite(state, [](const CSettingsObject& tree) { return tree.GetJSONString(); });
}
void BM_ReadJSON(benchmark::State& state) {
  RunRead(state, Tree()->GetJSONString(), CSettingsObject::ReadFromJSONBuffer);
}
void BM_ReadJSON1MiB(benchmark::State& state) {
  RunRead(state, MebibyteJSON(), CSettingsObject::ReadFromJSONBuffer);
}
void BM_WriteASN1(benchmark::State& state) {
  RunWrite(state, [](const CSettingsObject& tree) { return tree.GetASN1Binary(); });
}
void BM_ReadASN1(benchmark::State& state) {
  RunRead(state, Tree()->GetASN1Binary(), CSettingsObject::ReadFromASN1Binary);
}
void BM_WriteCompressed(benchmark::State& state) {
  RunWrite(state, [](const CSettingsObject& tree) { return tree.GetCompressedBinary(); });
}
void BM_ReadCompressed(benchmark::State& state) {
  RunRead(state, Tree()->GetCompressedBinary(), CSettingsObject::ReadFromCompressedBinary);
}

}  // namespace

BENCHMARK(BM_WriteXML)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ReadXML)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_WritePList)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ReadPList)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_WriteJSON)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ReadJSON)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ReadJSON1MiB)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_WriteASN1)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ReadASN1)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_WriteCompressed)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ReadCompressed)->Unit(benchmark::kMillisecond);

namespace {

bool WriteDocuments(const std::string& folder_I) {
  const std::pair<const char*, std::string> documents[] = {
      {"tree.xml", Tree()->GetXMLString("")},
      {"tree.plist", Tree()->GetPListString(true)},
      {"tree.json", Tree()->GetJSONString()},
      {"mebibyte.json", MebibyteJSON()},
  };
  for (const auto& [name, text] : documents) {
    std::ofstream out(folder_I + "/" + name, std::ios::binary);
    out << text;
    if (!out.flush()) return false;
  }
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc == 3 && std::strcmp(argv[1], "--write-documents") == 0) {
    return WriteDocuments(argv[2]) ? 0 : 1;
  }
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  return 0;
}
