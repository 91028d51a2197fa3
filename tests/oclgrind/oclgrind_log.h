// What Oclgrind has found so far.
#pragma once

#include <string>

// The text of the log that OCLGRIND_LOG names; a line that says so when there is none to read.
std::string oclgrindLog();
