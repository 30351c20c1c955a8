#pragma once

/// The closing table of a benchmark program: figures beside the floor and the goals that they are measured against.
///
/// A figure that misses its goal is said to have missed it and fails nothing: machines differ, and a time is no assertion.
/// Threads: one. Errors: a figure that a filter left out is "not measured".

#include <benchmark/benchmark.h>

#include <map>
#include <optional>
#include <string>
#include <vector>

namespace palisade {

struct Figure {
  double nanoseconds = 0;
  double allocations = 0;
};

/// Shows and keeps of every benchmark the fastest of its repetitions: what disturbs a measurement only ever makes it slower.
class FastestRuns final : public benchmark::ConsoleReporter {
 public:
  using ConsoleReporter::ConsoleReporter;

  void ReportRuns(const std::vector<Run>& runs) override;

  std::optional<Figure> figure(const std::string& benchmark) const;

 private:
  std::map<std::string, Figure> _figures;
};

/// Prints the table of what the plug-in's benchmarks measured.
void printFigures(const FastestRuns& runs);

}  // namespace palisade
