#include "report.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <string_view>

namespace bench {
namespace {

struct Column {
    const char* title;
    const char* counter;
    int digits;  // behind the point
};

struct Group {
    const char* prefix;  // of the benchmarks' names
    const char* title;
    std::vector<Column> columns;
};

const std::vector<Group>& groups() {
    static const std::vector<Group> all = {
        {"throughput/",
         "Filters beside a copy kernel of the same launch shape and layout",
         {{"ms", "median_ms", 2},
          {"least ms", "min_ms", 2},
          {"GB/s", "GB_per_s", 2},
          {"copy GB/s", "copy_GB_per_s", 2},
          {"of copy", "fraction_of_copy", 2}}},
        {"startup/",
         "First execution in a fresh process",
         {{"context ms", "context_ms", 1},
          {"cold ms", "cold_ms", 1},
          {"warm ms", "warm_ms", 1},
          {"warm/cold", "warm_over_cold", 3},
          {"second ms", "second_ms", 1},
          {"compiled cold", "cold_compiled", 0},
          {"warm", "warm_compiled", 0},
          {"second", "second_compiled", 0}}},
        {"creation/", "Creation of a filter", {{"first us", "first_us", 1}, {"later us", "later_us", 1}}},
        {"host/",
         "One execution on 64 x 64 pixels beside the bare launches",
         {{"passes", "passes", 0},
          {"us", "execute_us", 1},
          {"bare us", "bare_us", 1},
          {"added us/pass", "added_per_pass_us", 1},
          {"least added", "least_added_us", 1}}}};
    return all;
}

std::string fixed(double value, int digits) {
    std::array<char, 400> text{};  // the longest double in fixed notation has 309 digits before the point
    const auto end = std::to_chars(text.data(), text.data() + text.size(), value, std::chars_format::fixed, digits).ptr;
    return {text.data(), static_cast<size_t>(end - text.data())};
}

std::string padded(const std::string& text, size_t width, bool right) {
    const std::string blanks(text.size() < width ? width - text.size() : 0, ' ');
    return right ? blanks + text : text + blanks;
}

// The run's name without the group and without what the benchmark library appends ("/manual_time" ...).
std::string shortName(const std::string& name, const Group& group) {
    std::string_view text = name;
    text.remove_prefix(std::string_view(group.prefix).size());
    for (const std::string_view appended : {"/iterations:", "/min_time:", "/manual_time"})
        text = text.substr(0, text.find(appended));
    return std::string(text);
}

using Run = benchmark::BenchmarkReporter::Run;

bool belongs(const Run& run, const Group& group) {
    return run.run_type == Run::RT_Iteration && run.benchmark_name().rfind(group.prefix, 0) == 0;
}

std::string cell(const Run& run, const Column& column) {
    const auto found = run.counters.find(column.counter);
    return found == run.counters.end() ? "-" : fixed(found->second.value, column.digits);
}

void printRow(std::FILE* out, const Run& run, const Group& group, size_t nameWidth) {
    std::string line = padded(shortName(run.benchmark_name(), group), nameWidth, false);
    for (const Column& column : group.columns)
        line += "  " + padded(run.error_occurred ? "-" : cell(run, column),
                              std::max<size_t>(std::string_view(column.title).size(), 7), true);
    if (run.error_occurred) line += "  " + run.error_message;
    std::fprintf(out, "%s\n", line.c_str());
}

void printGroup(std::FILE* out, const Group& group, const std::vector<Run>& runs) {
    size_t nameWidth = 0;
    for (const Run& run : runs)
        if (belongs(run, group)) nameWidth = std::max(nameWidth, shortName(run.benchmark_name(), group).size());
    if (nameWidth == 0) return;
    std::string head(nameWidth, ' ');
    for (const Column& column : group.columns)
        head += "  " + padded(column.title, std::max<size_t>(std::string_view(column.title).size(), 7), true);
    std::fprintf(out, "\n%s\n%s\n", group.title, head.c_str());
    for (const Run& run : runs)
        if (belongs(run, group)) printRow(out, run, group, nameWidth);
}

}  // namespace

bool TableReporter::ReportContext(const Context&) {
    std::fprintf(out_, "Device: %s\n", device_.c_str());
    return true;
}

void TableReporter::ReportRuns(const std::vector<Run>& runs) {
    for (const Run& run : runs) {
        std::fprintf(stderr, "%s%s\n", run.benchmark_name().c_str(), run.error_occurred ? " failed" : "");
        runs_.push_back(run);
    }
}

void TableReporter::Finalize() {
    for (const Group& group : groups()) printGroup(out_, group, runs_);
    std::fflush(out_);
}

}  // namespace bench
