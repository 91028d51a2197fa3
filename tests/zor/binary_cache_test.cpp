// The binary cache: names, ages, what may be used, what is written, and how it fails.
#include <sys/resource.h>
#include <sys/stat.h>

#include <chrono>
#include <csignal>
#include <fstream>

#include "fixture.h"
#include "zor/cache_store.h"

using namespace std::chrono_literals;

class BinaryCache : public OnStandin {
 protected:
    // Looks the kernel up on a fresh device, so that the map in memory holds nothing. True when it was compiled.
    bool compiles(std::optional<std::string_view> options = " -D A") {
        device = makeDevice();
        const size_t before = driver().callCount("clCreateProgramWithSource");
        request.options = options;
        printed();
        EXPECT_NE(device->getKernel(request), nullptr);
        return driver().callCount("clCreateProgramWithSource") > before;
    }
    std::string name(std::string_view file = "Filters", std::optional<std::string_view> options = " -D A") {
        return zor::binaryFileName(opencl(device), file, options);
    }
    static int64_t files() { return std::distance(fs::directory_iterator("cache"), {}); }
    static void writeText(const std::string& path, const std::string& text) { std::ofstream(path) << text; }

    std::string_view source = "kernel void k() {}";
    zor::KernelRequest request{.fileName = "Filters", .kernelName = "k", .sources = {&source, 1}};
};

TEST_F(BinaryCache, NamesFilesAfterDirectoryBaseNameHashDeviceAndDriver) {
    EXPECT_EQ(name("abc", ""), "cache/abc-ed131f5b.v.0.Stand-in GPU.1.0_64.bin") << "the hash's published value";
    EXPECT_EQ(name("../Tovkit/Impl\\CL/Filters", {}), "cache/Filters-0x0.v.0.Stand-in GPU.1.0_64.bin");
    zor::setCacheDirectory(std::string(300, 'd'));
    EXPECT_EQ(zor::cacheDirectory(), std::string(127, 'd'));
}

TEST_F(BinaryCache, ASecondProgramOfTheSameInputsComesFromDisk) {
    EXPECT_TRUE(compiles());
    EXPECT_EQ(printed(), "File not found " + name() + "\nCached file created " + name() + "\n");
    EXPECT_FALSE(compiles());
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, " -D A") << "the binary is built with the same options";
    EXPECT_EQ(driver().lastCall("clCreateProgramWithBinary").text, zor::readFile(name())) << "the driver's bytes alone";
    EXPECT_TRUE(compiles(" -D B"));
    request.keepInCache = false;
    EXPECT_TRUE(compiles());
    request = {.kernelName = "k", .sources = {&source, 1}};
    EXPECT_TRUE(compiles());
    EXPECT_EQ(files(), 4) << "nothing is cached without a name";
}

TEST_F(BinaryCache, ABinaryMustBeNewerThanTheLibraryItsSourceAndItsDependencies) {
    const std::string_view dependencies[] = {"missing.h", "common.cl"};
    request.dependencies = dependencies;
    EXPECT_TRUE(compiles());
    for (const char* file : {"Filters.cl", "common.cl"}) {
        const auto time = fs::last_write_time(name());
        writeText(file, "never read");
        fs::last_write_time(file, time - 1s);
        EXPECT_FALSE(compiles()) << file;
        fs::last_write_time(file, time);
        EXPECT_TRUE(compiles()) << file << ": equal times are not current";
        fs::remove(file);
    }
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, source);
    fs::last_write_time(name(), fs::last_write_time("/proc/self/exe"));
    EXPECT_TRUE(compiles());
}

TEST_F(BinaryCache, WithoutTextsTheSourceIsReadFromDiskUnlessItsBinaryServes) {
    request.sources = {};
    EXPECT_EQ(device->getKernel(request), nullptr) << "there is no such file";
    writeText("Filters.cl", "kernel void k() {} // own");
    EXPECT_TRUE(compiles(std::nullopt));
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, "kernel void k() {} // own");
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, "-I ..\\..\\");
    fs::remove("Filters.cl");
    EXPECT_FALSE(compiles(std::nullopt));
}

TEST_F(BinaryCache, WhatIsDamagedNeverReachesTheDriverAndWhatThatRefusesIsWrittenAfresh) {
    const std::string file = name();
    const std::string side = file + ".options";
    const std::pair<const char*, std::function<void()>> damages[] = {
        {"refused", [&] { driver().fail("clCreateProgramWithBinary", CL_INVALID_BINARY); }},
        {"cut", [&] { fs::resize_file(file, fs::file_size(file) - 1); }},
        {"changed", [&] { writeText(file, std::string(fs::file_size(file), 'x')); }},
        {"a pipe", [&] { fs::remove(file), mkfifo(file.c_str(), 0600); }},
        {"side file lost", [&] { fs::remove(side); }},
        {"side file cut", [&] { fs::resize_file(side, 3); }},
        {"other options", [&] { writeText(side, " -D B" + zor::readFile(side)->substr(5)); }},
    };
    EXPECT_TRUE(compiles());
    for (const auto& [what, damage] : damages) {
        damage();
        EXPECT_TRUE(compiles()) << what;
        EXPECT_FALSE(compiles()) << what;
    }
    EXPECT_EQ(driver().callCount("clCreateProgramWithBinary"), 1 + std::size(damages)) << "the refused and the whole";
}

TEST_F(BinaryCache, ProgramsOfOneFileNameNeverMeet) {
    const std::string first = " -D N=125607";
    const std::string second = " -D N=168200";
    ASSERT_EQ(name("Filters", first), name("Filters", second)) << "their hashes agree";
    EXPECT_TRUE(compiles(first));
    EXPECT_TRUE(compiles(second));
    source = "kernel void k() {} // changed";
    EXPECT_TRUE(compiles(second));
    firstDevice().name = "A.1";
    EXPECT_TRUE(compiles(second));
    firstDevice().name = "A";
    firstDevice().driverVersion = "1.1.0";
    EXPECT_TRUE(compiles(second)) << "device and driver together read the same";
}

TEST_F(BinaryCache, WhatCannotBeNamedIsNotCached) {
    fs::create_directories(name().substr(0, name().find("Stand-in")) + "GeForce");
    writeText("plain", "");
    const std::tuple<const char*, std::string, const char*> names[] = {{"GeForce/../Device", "1", "cache"},
                                                                       {"A", std::string(400, 'v'), "cache"},
                                                                       {"A", "1", "plain"},
                                                                       {"A", "1", ""}};
    for (const auto& [deviceName, version, directory] : names) {
        firstDevice().name = deviceName;
        firstDevice().driverVersion = version;
        zor::setCacheDirectory(directory);
        EXPECT_TRUE(compiles());
        EXPECT_THAT(printed(), testing::Not(testing::HasSubstr("created"))) << deviceName << version << directory;
    }
}

// Writes beyond the limit fail as on a full disk, after a part has been written.
TEST_F(BinaryCache, AFileThatCannotBeWrittenWholeLeavesNothingBehind) {
    const std::string large = "kernel void k() {}" + std::string(100000, ' ');
    source = large;
    rlimit before{};
    getrlimit(RLIMIT_FSIZE, &before);
    std::signal(SIGXFSZ, SIG_IGN);
    const rlimit limited = {99999, before.rlim_max};
    setrlimit(RLIMIT_FSIZE, &limited);
    EXPECT_TRUE(compiles());
    setrlimit(RLIMIT_FSIZE, &before);
    EXPECT_EQ(files(), 0);
}
