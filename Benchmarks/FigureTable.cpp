#include "Benchmarks/FigureTable.h"

#include <cstdio>
#include <vector>

namespace palisade {
namespace {

constexpr const char* floorBenchmark = "SetOfTenNamesBuiltAndIntersected";

constexpr int sizes[] = {10, 100, 1'000, 10'000};

// A step to ten times as many permissions may take ten times as long, and as long again for what leaves the processor's
// caches on the way. Anything quadratic takes a hundred times as long.
constexpr double greatestGrowthPerStep = 20;

struct Goal {
  const char* benchmark;
  const char* says;
  bool (*isMet)(const Figure& figure, const Figure& floor);
};

constexpr Goal goals[] = {
    {"RequestAnsweredFromAnEarlierGrant/10", "at most 4 x floor",
     [](const Figure& figure, const Figure& floor) { return figure.nanoseconds <= 4 * floor.nanoseconds; }},
    {"RequestAnsweredFromAnEarlierGrant/10", "at most 40 allocations",
     [](const Figure& figure, const Figure&) { return figure.allocations <= 40; }},
    {"ConsentSentence/10", "under 50 us", [](const Figure& figure, const Figure&) { return figure.nanoseconds < 50'000; }},
};

constexpr const char* singleFigures[] = {
    floorBenchmark,
    "RequestAnsweredFromAnEarlierGrant/10",
    "RequestRefusedAtThePrompt/10",
    "RequestAllowedAtThePrompt/10",
    "ValidationOfOptions/10",
    "ConsentSentence/10",
    "PhraseForFiftyFiveReadPermissions",
};

constexpr const char* growingFigures[] = {
    "RequestAnsweredFromAnEarlierGrant",
    "RequestRefusedAtThePrompt",
    "RequestAllowedAtThePrompt",
    "ValidationOfOptions",
    "ConsentSentence",
};

const char* verdict(bool isMet) { return isMet ? "met" : "missed"; }

void printSingleFigures(const FastestRuns& runs) {
  const std::optional<Figure> floor = runs.figure(floorBenchmark);
  std::printf("\n%-40s %12s %9s %12s   %s\n", "one operation", "time", "x floor", "allocations", "goal");
  for (const char* const name : singleFigures) {
    const std::optional<Figure> figure = runs.figure(name);
    if (!figure) {
      std::printf("%-40s %12s\n", name, "not measured");
      continue;
    }
    std::printf("%-40s %9.2f us", name, figure->nanoseconds / 1000);
    if (floor) std::printf(" %9.2f", figure->nanoseconds / floor->nanoseconds);
    std::printf(" %12.0f", figure->allocations);
    const char* separator = "   ";
    for (const Goal& goal : goals) {
      if (std::string(goal.benchmark) != name || !floor) continue;
      std::printf("%s%s: %s", separator, goal.says, verdict(goal.isMet(*figure, *floor)));
      separator = "; ";
    }
    std::printf("\n");
  }
}

void printGrowth(const FastestRuns& runs) {
  std::printf("\n%-40s %9d %9d %9d %9d   %s\n", "nanoseconds (allocations) a permission", sizes[0], sizes[1], sizes[2],
              sizes[3], "goal: linear");
  for (const char* const name : growingFigures) {
    std::vector<Figure> figures;
    for (const int size : sizes) {
      if (const auto figure = runs.figure(std::string(name) + '/' + std::to_string(size))) figures.push_back(*figure);
    }
    std::printf("%-40s", name);
    if (figures.size() != std::size(sizes)) {
      std::printf(" not measured\n");
      continue;
    }
    bool isLinear = true;
    for (std::size_t index = 0; index < figures.size(); ++index) {
      std::printf(" %4.0f (%2.0f)", figures[index].nanoseconds / sizes[index], figures[index].allocations / sizes[index]);
      if (index == 0) continue;
      isLinear &= figures[index].nanoseconds <= greatestGrowthPerStep * figures[index - 1].nanoseconds;
      isLinear &= figures[index].allocations <= greatestGrowthPerStep * figures[index - 1].allocations;
    }
    std::printf("   %s\n", verdict(isLinear));
  }
}

}  // namespace

void FastestRuns::ReportRuns(const std::vector<Run>& runs) {
  const Run* fastest = nullptr;
  for (const Run& run : runs) {
    if (run.run_type != Run::RT_Iteration || run.error_occurred) continue;
    if (fastest == nullptr || run.GetAdjustedCPUTime() < fastest->GetAdjustedCPUTime()) fastest = &run;
  }
  if (fastest == nullptr) {
    // Failures are shown, statistics over the repetitions are not.
    if (!runs.empty() && runs.front().error_occurred) ConsoleReporter::ReportRuns(runs);
    return;
  }
  Run shown = *fastest;
  shown.repetitions = 1;
  ConsoleReporter::ReportRuns({shown});
  const auto allocations = fastest->counters.find("allocations");
  _figures[fastest->run_name.function_name + (fastest->run_name.args.empty() ? "" : '/' + fastest->run_name.args)] = {
      .nanoseconds = fastest->GetAdjustedCPUTime(),
      .allocations = allocations == fastest->counters.end() ? 0 : allocations->second.value};
}

std::optional<Figure> FastestRuns::figure(const std::string& benchmark) const {
  const auto found = _figures.find(benchmark);
  return found == _figures.end() ? std::nullopt : std::optional(found->second);
}

void printFigures(const FastestRuns& runs) {
  printSingleFigures(runs);
  printGrowth(runs);
}

}  // namespace palisade
