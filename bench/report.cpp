#include "report.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <string_view>

namespace bench {
namespace {

constexpr size_t kNameWidth = 42;

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
          {"of copy", "fraction_of_copy", 2},
          {"CPU ms", "processor_ms", 2},
          {"copy CPU", "copy_processor_ms", 2},
          {"of copy", "processor_fraction_of_copy", 2}}},
        {"fusion/",
         "Three filters in one kernel beside the same filters apart",
         {{"fused ms", "fused_ms", 3},
          {"dearest ms", "dearest_ms", 3},
          {"sum ms", "sum_ms", 3},
          {"of dearest", "fused_over_dearest", 2},
          {"of sum", "fused_over_sum", 2},
          {"CPU ms", "fused_processor_ms", 3},
          {"sum CPU ms", "sum_processor_ms", 3}}},
        {"arithmetic/",
         "Denoisers beside multiply-adds in vectors of eight",
         {{"ms", "median_ms", 1},
          {"least ms", "min_ms", 1},
          {"CPU ms", "processor_ms", 1},
          {"GFLOP/CPU s", "GFLOP_per_processor_s", 2},
          {"of peak", "fraction_of_peak", 3}}},
        {"first_frame/",
         "First frame of a history, whose buffer is made and cleared",
         {{"ms", "median_ms", 1}, {"least ms", "min_ms", 1}, {"CPU ms", "processor_ms", 1}}},
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

size_t widthOf(const Column& column) {
    return std::max<size_t>(std::string_view(column.title).size(), 7);
}

void printHead(std::FILE* out, const Group& group) {
    std::string head(kNameWidth, ' ');
    for (const Column& column : group.columns) head += "  " + padded(column.title, widthOf(column), true);
    std::fprintf(out, "\n%s\n%s\n", group.title, head.c_str());
}

void printRow(std::FILE* out, const Group& group, const Run& run) {
    std::string line = padded(shortName(run.benchmark_name(), group), kNameWidth, false);
    for (const Column& column : group.columns)
        line += "  " + padded(run.error_occurred ? "-" : cell(run, column), widthOf(column), true);
    if (run.error_occurred) line += "  " + run.error_message;
    std::fprintf(out, "%s\n", line.c_str());
}

}  // namespace

bool TableReporter::ReportContext(const Context&) {
    std::fprintf(out_, "Device: %s\n", device_.c_str());
    return true;
}

void TableReporter::ReportRuns(const std::vector<Run>& runs) {
    for (const Run& run : runs) {
        hasFailures_ = hasFailures_ || run.error_occurred;
        for (const Group& group : groups()) {
            if (!belongs(run, group)) continue;
            if (group_ != group.prefix) printHead(out_, group);
            group_ = group.prefix;
            printRow(out_, group, run);
        }
    }
    std::fflush(out_);
}

}  // namespace bench
