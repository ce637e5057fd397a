// Setup-file loading at scale: a generated ~20 MB setup file with 500,000 keywords is loaded and
// closed. Counters: file size, throughput, and the heap the loaded tree holds relative to the
// file size (glibc mallinfo2, measured while the file is loaded).
#include <benchmark/benchmark.h>
#include <malloc.h>
#include <stdlib.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>

#include "setup/SkfLibrary.h"

namespace {

constexpr int kKeywords = 500000;
constexpr int kPointsPerOutput = 1000;

// Appends one numbered point section (10 keywords) with the usual parameter kinds: strings with
// and without escapes, file names, booleans, integers and wrapped lists of doubles.
void AppendPoint(std::string& s, int k, int& keywords, int limit) {
  const std::string n = std::to_string(k);
  s += "      POINT_" + n + " {\n";
  const std::string lines[] = {
      "        name = \"Gauge " + n + " \\\"north\\\"\"\n",
      "        include = true\n",
      "        type = " + std::to_string(k % 4) + "\n",
      "        position = 512" + n + ".125, 6171" + n + ".5, -3.25\n",
      "        data_file = <data/gauge_" + n + ".vds0>\n",
      "        item_numbers = 1, 2, 3, 4\n",
      "        weights = 0.125, 0.25, 0.5, 0.75, 1.0, 1.25, 1.5, 1.75,   // wrapped list\n"
      "                  2.0, 2.25\n",
      "        factor = 1.0e-3;",
      " offset = -0.5\n",
      "        description = \"C:\\runs\\bay\"\n",
  };
  for (const std::string& line : lines) {
    if (keywords == limit) break;
    s += line;
    ++keywords;
  }
  if (s.back() != '\n') s += '\n';
  s += "      }\n";
}

std::string MakeSetupText() {
  std::string s;
  s.reserve(21u << 20);
  s += "// Generated setup file for the load benchmark.\n";
  s += "TesselHD {\n";
  int keywords = 0;
  s += "  GPU_timing = 1\n";
  ++keywords;
  s += "  TIME {\n    start_time = 2024, 3, 1, 0, 0, 0\n    time_step_interval = 30.0\n"
       "    number_of_time_steps = 2880\n  }\n";
  keywords += 3;
  s += "  HYDRODYNAMIC_MODULE {\n    mode = 2\n    OUTPUTS {\n";
  ++keywords;
  int output = 0;
  int point = 0;
  while (keywords < kKeywords) {
    ++output;
    s += "    OUTPUT_" + std::to_string(output) + " {\n";
    s += "      file_name = <results/output_" + std::to_string(output) + ".vdsu>\n";
    s += "      title = \"Output " + std::to_string(output) + "\"\n";
    s += "      first_time_step = 0; last_time_step = 2880; time_step_frequency = 10\n";
    keywords += 5;
    for (int j = 0; j < kPointsPerOutput && keywords < kKeywords; ++j)
      AppendPoint(s, ++point, keywords, kKeywords);
    s += "    }\n";
  }
  s += "    }\n  }\n}\n";
  return s;
}

// The generated file, written once into a scratch folder that is removed at exit.
class SetupFixture {
 public:
  SetupFixture() {
    std::string templ = (std::filesystem::temp_directory_path() / "tavrin-bench-XXXXXX").string();
    if (mkdtemp(templ.data()) == nullptr) throw std::runtime_error("mkdtemp failed");
    folder_ = templ;
    path_ = folder_ + "/large.skf";
    const std::string text = MakeSetupText();
    std::ofstream(path_, std::ios::binary) << text;
    size_ = text.size();
  }
  ~SetupFixture() {
    std::error_code ec;
    std::filesystem::remove_all(folder_, ec);
  }
  const std::string& path() const { return path_; }
  std::size_t size() const { return size_; }

 private:
  std::string folder_;
  std::string path_;
  std::size_t size_ = 0;
};

const SetupFixture& Fixture() {
  static const SetupFixture fixture;
  return fixture;
}

std::size_t HeapInUse() {
  const struct mallinfo2 mi = mallinfo2();
  return mi.uordblks + mi.hblkhd;  // small blocks plus mmap-ed large ones
}

int CountKeywords(const SkfBlock* b) {
  int n = skfGetNoKeywords(b);
  for (int i = 1; i <= skfGetNoSections(b); ++i) n += CountKeywords(skfSectionByNum(b, i));
  return n;
}

void BM_SetupLoad(benchmark::State& state) {
  const SetupFixture& fx = Fixture();
  // Heap held by the loaded tree, and a check that the file is what it claims to be.
  const std::size_t before = HeapInUse();
  SkfFile* probe = skfLoadFile(fx.path().c_str(), -1);
  const std::size_t after = HeapInUse();
  if (probe == nullptr || skfGetNoTargets(probe) != 1) {
    state.SkipWithError("generated setup file did not load");
    skfClose(probe);
    return;
  }
  const int keywords = CountKeywords(skfTargetByNum(probe, 1));
  skfClose(probe);

  for (auto _ : state) {
    SkfFile* f = skfLoadFile(fx.path().c_str(), -1);
    benchmark::DoNotOptimize(f);
    skfClose(f);
  }
  state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations()) *
                          static_cast<std::int64_t>(fx.size()));
  state.counters["file_MB"] = static_cast<double>(fx.size()) / 1e6;
  state.counters["keywords"] = keywords;
  state.counters["MB_per_s"] = benchmark::Counter(static_cast<double>(fx.size()) / 1e6 *
                                                      static_cast<double>(state.iterations()),
                                                  benchmark::Counter::kIsRate);
  state.counters["mem_ratio"] =
      static_cast<double>(after > before ? after - before : 0) / static_cast<double>(fx.size());
}
BENCHMARK(BM_SetupLoad)->Unit(benchmark::kMillisecond)->MinTime(3.0);

// Name lookups over the loaded tree: every numbered point section by name, then one keyword of
// each. Parents hold 1000 sections, so a quadratic lookup would show here.
void BM_SetupLookup(benchmark::State& state) {
  SkfFile* f = skfLoadFile(Fixture().path().c_str(), -1);
  SkfBlock* outputs = skfSectionByNameNum(
      skfSectionByNameNum(skfTargetByNum(f, 1), "HYDRODYNAMIC_MODULE", 1), "OUTPUTS", 1);
  if (outputs == nullptr) {
    state.SkipWithError("generated setup file did not load");
    skfClose(f);
    return;
  }
  std::int64_t lookups = 0;
  for (auto _ : state) {
    double sum = 0;
    int point = 0;
    for (int o = 1; o <= skfGetNoSections(outputs); ++o) {
      SkfBlock* out = skfSectionByNum(outputs, o);
      for (int j = 0; j < skfGetNoSections(out); ++j) {
        const std::string name = "POINT_" + std::to_string(++point);
        SkfBlock* p = skfSectionByNameNum(out, name.c_str(), 1);
        sum += skfGetDouble(skfParamByNum(skfKeywordByNameNum(p, "weights", 1), 10));
        lookups += 2;
      }
    }
    benchmark::DoNotOptimize(sum);
  }
  state.counters["lookups_per_s"] =
      benchmark::Counter(static_cast<double>(lookups), benchmark::Counter::kIsRate);
  skfClose(f);
}
BENCHMARK(BM_SetupLookup)->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
