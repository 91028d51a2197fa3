#include "zor/cache_name.h"

#include <algorithm>
#include <array>
#include <filesystem>

#include "zor/device_cl.h"
#include "zor/number_text.h"

namespace zor {
namespace {

constexpr uint32_t kWordBits = 64;
static_assert(sizeof(void*) * 8 == kWordBits, "the word size is part of every cache file name");

#ifdef _WIN32
constexpr std::string_view kForbiddenInNames = "\\/:*?\"<>|";
#else
constexpr std::string_view kForbiddenInNames = "/";
#endif

std::array<char, kCacheDirectoryBytes> directoryText = {'c', 'a', 'c', 'h', 'e'};

std::string_view baseName(std::string_view fileName) noexcept {
    for (const char separator : {'\\', '/'}) {
        const size_t last = fileName.rfind(separator);
        if (last != std::string_view::npos) fileName.remove_prefix(last + 1);
    }
    return fileName;
}

uint64_t hashSized(std::string_view text, uint64_t hash) {
    return fnv1a(text, fnv1a(hexadecimal(text.size(), 16), hash));
}

}  // namespace

void setCacheDirectory(std::string_view directory) noexcept {
    const size_t length = std::min(directory.size(), directoryText.size() - 1);
    std::copy_n(directory.begin(), length, directoryText.begin());
    directoryText[length] = '\0';
}

const char* cacheDirectory() noexcept {
    return directoryText.data();
}

uint32_t oneAtATimeHash(std::string_view text, uint32_t seed) noexcept {
    uint32_t hash = seed;
    for (const char byte : text) {
        hash += static_cast<uint32_t>(static_cast<int32_t>(static_cast<signed char>(byte)));
        hash += hash << 10;
        hash ^= hash >> 6;
    }
    hash += hash << 3;
    hash ^= hash >> 11;
    hash += hash << 15;
    return hash;
}

std::string binaryFileName(const DeviceCL& device, std::string_view fileName, std::optional<std::string_view> options) {
    std::string optionHash = "0x0";
    if (!fileName.empty() && options)
        optionHash = hexadecimal(oneAtATimeHash(std::string(fileName).append(*options), 0), 8);
    std::string name = cacheDirectory();
    name.append("/").append(baseName(fileName)).append("-").append(optionHash);
    name.append(".v.").append(std::to_string(device.binaryVersion()));
    name.append(".").append(device.deviceName()).append(".").append(device.driverVersion());
    name.append("_").append(std::to_string(kWordBits)).append(".bin");
    return name;
}

uint64_t fnv1a(std::string_view text, uint64_t hash) noexcept {
    constexpr uint64_t kPrime = 1099511628211u;
    for (const char byte : text) hash = (hash ^ static_cast<unsigned char>(byte)) * kPrime;
    return hash;
}

uint64_t programIdentity(const DeviceCL& device, std::string_view fileName, std::span<const std::string_view> sources) {
    uint64_t hash = kFnvOffset;
    for (const std::string_view text :
         {std::string_view(device.deviceName()), std::string_view(device.driverVersion()), fileName})
        hash = hashSized(text, hash);
    for (const std::string_view source : sources) hash = hashSized(source, hash);
    return hash;
}

bool isCacheable(const DeviceCL& device) noexcept {
    return directoryText[0] != '\0' && device.deviceName().find_first_of(kForbiddenInNames) == std::string::npos &&
           device.driverVersion().find_first_of(kForbiddenInNames) == std::string::npos;
}

void createCacheDirectory() {
    std::error_code ignored;
    std::filesystem::create_directory(cacheDirectory(), ignored);
}

}  // namespace zor
