// Pieces of the compiler's option text. Every piece carries its own blanks.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "api/tov/types.h"

// Locale-free decimal and "six significant digits" forms, as a default stream prints them.
std::string decimal(uint64_t value);
std::string sixDigits(float value);
// "0.274069" for 0.2740686: fixed notation with six digits after the point.
std::string fixedSixDigits(float value);

// " -D <name>=<value>".
std::string define(std::string_view name, std::string_view value);

// Layout definitions of an image bound under a name: its size, component count and component type. An OpenCL image
// object has an empty count and the type "sampler".
std::string GetImageDefines(std::string_view name, const tov_image_desc& desc, bool isOpenClImage);

// The same for an image that is computed where it is read: no layout, only a size.
std::string computedImageDefines(std::string_view name, uint32_t width, uint32_t height);

// The same for an absent image: both "none", size 1 x 1.
std::string absentImageDefines(std::string_view name);

// One-at-a-time hash (Bob Jenkins) with start value 1; bytes count as signed.
uint32_t HashSource(const char* text, size_t length) noexcept;
