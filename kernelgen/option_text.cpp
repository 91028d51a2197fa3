#include "kernelgen/option_text.h"

#include <array>
#include <charconv>

#include "zor/cache_name.h"

namespace {

constexpr uint32_t kHashSeed = 1;

std::string format(float value, std::chars_format form) {
    std::array<char, 64> text{};  // a float in fixed notation takes at most 39 digits, a point and six digits more
    const auto end = std::to_chars(text.data(), text.data() + text.size(), value, form, 6).ptr;
    return {text.data(), end};
}

const char* componentTypeName(uint32_t type) noexcept {
    switch (type) {
        case TOV_COMPONENT_TYPE_UINT8:
            return "uint";
        case TOV_COMPONENT_TYPE_FLOAT16:
            return "half";
        case TOV_COMPONENT_TYPE_FLOAT32:
            return "float";
        default:
            return "";
    }
}

std::string sizeDefine(std::string_view name, uint32_t width, uint32_t height) {
    // Kernels take sizes as signed numbers, so they are written that way.
    const auto number = [](uint32_t value) { return std::to_string(static_cast<int32_t>(value)); };
    return " -D " + std::string(name) + "_Res=(int2)(" + number(width) + "," + number(height) + ")";
}

}  // namespace

std::string decimal(uint64_t value) {
    return std::to_string(value);
}
std::string sixDigits(float value) {
    return format(value, std::chars_format::general);
}
std::string fixedSixDigits(float value) {
    return format(value, std::chars_format::fixed);
}

std::string define(std::string_view name, std::string_view value) {
    return std::string(" -D ").append(name).append("=").append(value);
}

std::string GetImageDefines(std::string_view name, const tov_image_desc& desc, bool isOpenClImage) {
    const std::string prefix(name);
    return sizeDefine(name, desc.image_width, desc.image_height) +
           define(prefix + "_COMP_NUM", isOpenClImage ? "" : decimal(desc.num_components)) +
           define(prefix + "_COMP_TYPE", isOpenClImage ? "sampler" : componentTypeName(desc.type));
}

std::string computedImageDefines(std::string_view name, uint32_t width, uint32_t height) {
    const std::string prefix(name);
    return sizeDefine(name, width, height) + define(prefix + "_COMP_NUM", "none") +
           define(prefix + "_COMP_TYPE", "none");
}

std::string absentImageDefines(std::string_view name) {
    const std::string prefix(name);
    return define(prefix + "_COMP_NUM", "none") + define(prefix + "_COMP_TYPE", "none") +
           define(prefix + "_Res", "(int2)1");
}

uint32_t HashSource(const char* text, size_t length) noexcept {
    return zor::oneAtATimeHash({text, length}, kHashSeed);
}
