// The summary: one plain table per group of benchmarks, numbers independent of the locale.
#pragma once

#include <benchmark/benchmark.h>

#include <cstdio>
#include <string>
#include <vector>

namespace bench {

// Prints a line to standard error as each benchmark ends, and the tables to `out` at the end.
class TableReporter : public benchmark::BenchmarkReporter {
 public:
    TableReporter(std::FILE* out, std::string device) : out_(out), device_(std::move(device)) {}

    bool ReportContext(const Context& context) override;
    void ReportRuns(const std::vector<Run>& runs) override;
    void Finalize() override;

 private:
    std::FILE* out_;
    std::string device_;
    std::vector<Run> runs_;
};

}  // namespace bench
