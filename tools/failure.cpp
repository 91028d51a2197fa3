// Names and meanings of the library's error codes.
#include "failure.h"

#include <array>
#include <system_error>

#include "tov/tov.h"

namespace tool {

namespace {

struct CodeText {
    int32_t code;
    const char* name;
    const char* meaning;
};

constexpr std::array kCodes = {
    CodeText{TOV_ERROR_INVALID_IMAGE, "TOV_ERROR_INVALID_IMAGE", "an image is missing or was deleted"},
    CodeText{TOV_ERROR_INVALID_IMAGE_DESC, "TOV_ERROR_INVALID_IMAGE_DESC", "an image description is missing"},
    CodeText{TOV_ERROR_OPENGL, "TOV_ERROR_OPENGL", "OpenGL reported an error"},
    CodeText{TOV_ERROR_INVALID_PARAMETER, "TOV_ERROR_INVALID_PARAMETER", "a value is not acceptable"},
    CodeText{TOV_ERROR_INVALID_CONTEXT, "TOV_ERROR_INVALID_CONTEXT", "there is no such device"},
    CodeText{TOV_ERROR_INVALID_QUEUE, "TOV_ERROR_INVALID_QUEUE", "a command queue is missing or was deleted"},
    CodeText{TOV_ERROR_INVALID_FILTER, "TOV_ERROR_INVALID_FILTER", "a filter is missing or was deleted"},
    CodeText{TOV_ERROR_INVALID_PARAMETER_NAME, "TOV_ERROR_INVALID_PARAMETER_NAME",
             "the filter has no parameter of that name"},
    CodeText{TOV_ERROR_INVALID_API_VERSION, "TOV_ERROR_INVALID_API_VERSION", "the library has another interface"},
    CodeText{TOV_ERROR_INTERNAL_ERROR, "TOV_ERROR_INTERNAL_ERROR", "the driver refused or memory is exhausted"},
    CodeText{TOV_ERROR_UNSUPPORTED, "TOV_ERROR_UNSUPPORTED", "this cannot be done"},
    CodeText{TOV_ERROR_INVALID_OPERATION, "TOV_ERROR_INVALID_OPERATION", "the filter cannot work on these images"},
};

}  // namespace

std::string describeCode(int32_t code) {
    for (const CodeText& row : kCodes) {
        if (row.code == code) return std::string(row.name) + " (" + std::to_string(code) + "): " + row.meaning;
    }
    return "unknown code " + std::to_string(code);
}

void check(int32_t code, std::string_view doing) {
    if (code == TOV_SUCCESS) return;
    throw Failure(ExitStatus::kFailed, std::string(doing) + " failed: " + describeCode(code));
}

std::string systemError(int error) {
    return std::generic_category().message(error);
}

}  // namespace tool
