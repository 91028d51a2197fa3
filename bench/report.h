// The summary: one plain table per group of benchmarks, numbers independent of the locale.
#pragma once

#include <benchmark/benchmark.h>

#include <cstdio>
#include <string>
#include <vector>

namespace bench {

// Prints a row as each benchmark ends, so that a run that is interrupted keeps what it has measured.
class TableReporter : public benchmark::BenchmarkReporter {
 public:
    TableReporter(std::FILE* out, std::string device) : out_(out), device_(std::move(device)) {}

    bool ReportContext(const Context& context) override;
    void ReportRuns(const std::vector<Run>& runs) override;

    // Whether a benchmark has ended with an error so far.
    bool hasFailures() const noexcept { return hasFailures_; }

 private:
    std::FILE* out_;
    std::string device_;
    std::string group_;  // prefix of the group that the latest row belongs to
    bool hasFailures_ = false;
};

}  // namespace bench
