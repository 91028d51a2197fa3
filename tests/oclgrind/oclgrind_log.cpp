#include "oclgrind_log.h"

#include <cstdlib>
#include <fstream>
#include <iterator>

std::string oclgrindLog() {
    const char* path = std::getenv("OCLGRIND_LOG");
    if (path == nullptr) return "OCLGRIND_LOG is not set";
    std::ifstream log(path);
    if (!log) return std::string("no log at ") + path;
    return {std::istreambuf_iterator<char>(log), {}};
}
