#include "zor/kernel_builder.h"

#include <cstdio>
#include <utility>
#include <vector>

#include "zor/cache_name.h"
#include "zor/cache_store.h"
#include "zor/device_info.h"
#include "zor/file_time.h"

namespace zor {
namespace {

constexpr size_t kMaxSources = 127;
constexpr std::string_view kDefaultFileOptions = "-I ..\\..\\";

bool allUpToDate(const std::string& binary, std::span<const std::string_view> dependencies, bool missingOnesToo) {
    for (const std::string_view dependency : dependencies) {
        const std::string path(dependency);
        if (!missingOnesToo && !fileExists(path)) continue;
        if (!isFileUpToDate(binary, path)) return false;
    }
    return true;
}

}  // namespace

void KernelBuilder::buildFromSources(const KernelRequest& request) {
    CacheEntry entry;
    entry.options = request.options.value_or("");
    bool current = false;
    if (!request.fileName.empty() && isCacheable(device_)) {
        entry.path = binaryFileName(device_, request.fileName, request.options);
        entry.identity = programIdentity(device_, request.fileName, request.sources);
        current = isFileUpToDate(entry.path, std::string(request.fileName) + ".cl") && isNewerThanLibrary(entry.path) &&
                  allUpToDate(entry.path, request.dependencies, false);
        createCacheDirectory();
    }
    if (request.keepInCache && current && load(entry)) return;
    compile(request.sources, entry.options);
    store(std::move(entry), request.writeAfterRun);
}

bool KernelBuilder::buildFromFile(const KernelRequest& request, bool addExtension) {
    const std::string sourcePath = std::string(request.fileName) + (addExtension ? ".cl" : "");
    const std::string_view options = request.options.value_or(kDefaultFileOptions);
    CacheEntry entry;
    entry.options = options;
    bool current = false;
    if (isCacheable(device_)) {
        entry.path = binaryFileName(device_, request.fileName, options);
        entry.identity = programIdentity(device_, sourcePath, {});
        current = isFileUpToDate(entry.path, sourcePath) && allUpToDate(entry.path, request.dependencies, true);
        createCacheDirectory();
    }
    if (request.keepInCache && current && load(entry)) return true;
    const std::optional<std::string> source = readFile(sourcePath);
    if (!source) {
        std::printf("Kernel not found %s\n", sourcePath.c_str());
        std::fflush(stdout);
        return false;
    }
    const std::string_view text = *source;
    compile({&text, 1}, entry.options);
    store(std::move(entry), request.writeAfterRun);
    return true;
}

// A binary that the driver refuses is deleted; the caller then compiles and writes it afresh.
bool KernelBuilder::load(const CacheEntry& entry) {
    const std::optional<std::string> binary = loadBinary(entry);
    if (!binary) return false;
    const cl_device_id id = device_.id();
    const size_t size = binary->size();
    const auto* bytes = reinterpret_cast<const unsigned char*>(binary->data());
    int32_t accepted = CL_SUCCESS;
    int32_t status = CL_SUCCESS;
    ProgramHandle program(
        cl().clCreateProgramWithBinary(device_.getContext(), cl_uint{1}, &id, &size, &bytes, &accepted, &status));
    if (status == CL_SUCCESS) status = accepted;
    if (status == CL_SUCCESS && program != nullptr)
        status = cl().clBuildProgram(program.get(), cl_uint{1}, &id, entry.options.c_str(), nullptr, nullptr);
    if (status != CL_SUCCESS || program == nullptr) {
        removeBinary(entry);
        return false;
    }
    program_ = std::move(program);
    return true;
}

void KernelBuilder::compile(std::span<const std::string_view> sources, const std::string& options) {
    require(sources.size() <= kMaxSources, "clCreateProgramWithSource", "too many source texts");
    std::vector<const char*> texts;
    std::vector<size_t> lengths;
    for (const std::string_view source : sources) {
        texts.push_back(source.empty() ? "" : source.data());  // a length of 0 means: up to the zero byte
        lengths.push_back(source.size());
    }
    int32_t status = CL_SUCCESS;
    ProgramHandle program(cl().clCreateProgramWithSource(device_.getContext(), static_cast<cl_uint>(texts.size()),
                                                         texts.data(), lengths.data(), &status));
    check(status, "clCreateProgramWithSource");
    const cl_device_id id = device_.id();
    status = cl().clBuildProgram(program.get(), cl_uint{1}, &id, options.c_str(), nullptr, nullptr);
    if (status != CL_SUCCESS) return reportBuildFailure(program.get(), status);
    program_ = std::move(program);
}

void KernelBuilder::store(CacheEntry entry, bool afterRun) {
    if (program_ == nullptr || entry.path.empty()) return;
    if (afterRun) {
        unwritten_ = std::move(entry);
    } else {
        writeProgram(program_.get(), entry);
    }
}

std::optional<UnwrittenProgram> KernelBuilder::takeUnwritten() {
    if (!unwritten_) return std::nullopt;
    return UnwrittenProgram{std::move(program_), std::move(*std::exchange(unwritten_, std::nullopt))};
}

void KernelBuilder::reportBuildFailure(cl_program program, int32_t status) const {
    std::printf("clBuildProgram: %s (%d)\n", openCLErrorString(status), status);
    std::string log;
    const auto query = [&](size_t capacity, void* out, size_t* size) {
        return cl().clGetProgramBuildInfo(program, device_.id(), cl_program_build_info{CL_PROGRAM_BUILD_LOG}, capacity,
                                          out, size);
    };
    status = readText(query, log);
    std::printf("CL Kernel Load Failure: %d\n", status);
    std::printf("%s\n%s\n", log.c_str(), log.c_str());
    std::fflush(stdout);
    check(status, "clGetProgramBuildInfo");
}

}  // namespace zor
