// The binary cache: names, ages, what may be used, what is written, and how it fails.
#include <sys/resource.h>
#include <sys/stat.h>

#include <chrono>
#include <csignal>
#include <locale>
#include <thread>
#include <unordered_map>

#include "fixture.h"

using namespace std::chrono_literals;
using testing::HasSubstr;
using testing::Not;

class BinaryCache : public OnStandin {
 protected:
    // Looks the kernel up on a fresh device, so that the map in memory holds nothing. True when it was compiled.
    bool compiles(std::optional<std::string_view> options = " -D A") {
        device = makeDevice();
        const size_t before = driver().callCount("clCreateProgramWithSource");
        request.options = options;
        zor::Kernel* kernel = nullptr;
        lines = printed([&] { kernel = device->getKernel(request); });
        EXPECT_NE(kernel, nullptr);
        return driver().callCount("clCreateProgramWithSource") > before;
    }
    std::string name(std::string_view file, std::optional<std::string_view> options) {
        return zor::binaryFileName(opencl(device), file, options);
    }
    fs::path binary(std::string_view options = " -D A") { return folder / name(request.fileName, options); }
    fs::path sideFile() { return binary().string() + ".options"; }
    static size_t files() {
        std::error_code none;
        return static_cast<size_t>(std::distance(fs::directory_iterator(zor::cacheDirectory(), none), {}));
    }

    std::string_view source = "kernel void k() {}";
    zor::KernelRequest request{.fileName = "Filters", .kernelName = "k", .sources = {&source, 1}};
};

TEST_F(BinaryCache, NamesFilesAfterDirectoryBaseNameHashDeviceAndDriver) {
    EXPECT_EQ(name("abc", ""), "cache/abc-ed131f5b.v.0.Stand-in GPU.1.0_64.bin") << "the hash's published value";
    EXPECT_EQ(name("../Tovkit/Impl/CL/Filters", {}), "cache/Filters-0x0.v.0.Stand-in GPU.1.0_64.bin");
    EXPECT_EQ(name("", " -D A"), "cache/-0x0.v.0.Stand-in GPU.1.0_64.bin");
    EXPECT_EQ(name("a/b\\c", {}), name("a\\b/c", {}));
    EXPECT_NE(name("x/abc", " -D A"), name("y/abc", " -D A")) << "the hash takes the whole name";
    // The byte 0xE9 counts as -23: (h * 1025) ^ the same shifted right by 6, then the closing three steps.
    uint32_t hash = static_cast<uint32_t>(-23) * 1025u;
    hash = (hash ^ hash >> 6) * 9u;
    EXPECT_EQ(zor::oneAtATimeHash("\xE9", 0), (hash ^ hash >> 11) * 32769u);
    zor::setCacheDirectory(std::string(300, 'd'));
    EXPECT_EQ(zor::cacheDirectory(), std::string(127, 'd'));
}

TEST_F(BinaryCache, ASecondProgramOfTheSameInputsComesFromDisk) {
    EXPECT_TRUE(compiles());
    EXPECT_EQ(lines, "File not found " + name("Filters", " -D A") + "\nCached file created " +
                         name("Filters", " -D A") + "\n");
    EXPECT_FALSE(compiles());
    EXPECT_EQ(lines, "File not found Filters.cl\n");
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, " -D A") << "the binary is built with the same options";
    EXPECT_EQ(driver().lastCall("clCreateProgramWithBinary").text, readText(binary())) << "the driver's bytes alone";
    EXPECT_TRUE(compiles(" -D B"));
    EXPECT_TRUE(compiles(std::nullopt));
    EXPECT_FALSE(compiles(std::nullopt));
    EXPECT_EQ(files(), 6u);
    request.keepInCache = false;
    EXPECT_TRUE(compiles());
    request.keepInCache = true;
    fs::remove_all("cache");
    EXPECT_TRUE(compiles()) << "the directory is made again";
    request.fileName = {};
    EXPECT_TRUE(compiles());
    EXPECT_EQ(files(), 2u) << "nothing is cached without a name";
}

TEST_F(BinaryCache, AProgramToBeWrittenAfterItsRunIsWrittenByTheFirstLaunchThatSucceeds) {
    request.options = " -D A";
    request.writeAfterRun = true;
    zor::Kernel* const kernel = device->getKernel(request);
    const auto launch = [&] { zor::Launcher(*device, *kernel).launch2D(8, 8, 8, 8); };
    driver().fail("clEnqueueNDRangeKernel", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(launch(), zor::Error);
    EXPECT_EQ(files(), 0u);
    EXPECT_EQ(printed(launch), "Cached file created " + name("Filters", " -D A") + "\n");
    EXPECT_EQ(printed(launch), "");
    EXPECT_FALSE(compiles());
}

TEST_F(BinaryCache, ABinaryMustBeNewerThanItsSourceAndItsDependencies) {
    const std::string_view dependencies[] = {"missing.h", "common.cl"};
    request.dependencies = dependencies;
    EXPECT_TRUE(compiles());
    for (const char* file : {"Filters.cl", "common.cl"}) {
        const auto time = fs::last_write_time(binary());
        writeText(file, "never read");
        fs::last_write_time(file, time - 1s);
        EXPECT_FALSE(compiles()) << file;
        fs::last_write_time(file, time);
        EXPECT_TRUE(compiles()) << file << ": equal times are not current";
        fs::remove(file);
    }
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, source);
}

TEST_F(BinaryCache, AnotherProcessCompilesNothingUntilTheLibraryIsInstalledAnew) {
    fs::copy_file(CACHED_BUILD_PATH, "program");
    const auto compilesElsewhere = [&] {
        std::this_thread::sleep_for(20ms);  // the system's clock of files may stand still for as long
        EXPECT_EQ(std::system("./program > lines"), 0);
        return readText("lines").find("Cached file created") != std::string::npos;
    };
    EXPECT_TRUE(compilesElsewhere());
    EXPECT_FALSE(compilesElsewhere());
    // An installer may keep the file's own, older modification time; that its status changed tells.
    const auto longAgo = fs::last_write_time("program") - 24h * 3650;
    fs::last_write_time("program", longAgo);
    fs::last_write_time(binary(), longAgo + 24h);
    EXPECT_TRUE(compilesElsewhere());
    EXPECT_FALSE(compilesElsewhere());
}

TEST_F(BinaryCache, FreshnessSaysWhyAFileCannotBeOpened) {
    writeText("file", "");
    mkfifo("pipe", 0600);
    const auto answer = [&](const char* path) {
        return printed([&] { EXPECT_FALSE(zor::isFileUpToDate(path, "file")); });
    };
    EXPECT_EQ(answer("none/deep"), "File not found none/deep\n");
    EXPECT_EQ(answer("file/below"), "File path not found file/below\n");
    EXPECT_EQ(answer("pipe"), "Failed reading file with errorCode = 22\npipe\n") << "opening would block";
}

TEST_F(BinaryCache, WhatIsDamagedNeverReachesTheDriverAndWhatThatRefusesIsWrittenAfresh) {
    const struct {
        const char* what;
        size_t given;  // binaries that reach the driver
        std::function<void()> damage;
    } cases[] = {
        {"cut", 0, [&] { fs::resize_file(binary(), fs::file_size(binary()) - 1); }},
        {"changed", 0, [&] { writeText(binary(), std::string(fs::file_size(binary()), 'x')); }},
        {"side file lost", 0, [&] { fs::remove(sideFile()); }},
        {"side file cut", 0, [&] { fs::resize_file(sideFile(), 3); }},
        {"other options", 0, [&] { writeText(sideFile(), " -D B" + readText(sideFile()).substr(5)); }},
        {"refused", 1, [&] { driver().fail("clCreateProgramWithBinary", CL_INVALID_BINARY); }},
        {"not built", 1, [&] { driver().fail("clBuildProgram", CL_INVALID_BINARY); }},
    };
    EXPECT_TRUE(compiles());
    for (const auto& [what, given, damage] : cases) {
        const size_t before = driver().callCount("clCreateProgramWithBinary");
        damage();
        EXPECT_TRUE(compiles()) << what;
        EXPECT_EQ(driver().callCount("clCreateProgramWithBinary"), before + given) << what;
        EXPECT_FALSE(compiles()) << what;
    }
    driver().fail("clBuildProgram", CL_BUILD_PROGRAM_FAILURE, 1, 2);
    device = makeDevice();
    printed([&] { EXPECT_EQ(device->getKernel(request), nullptr); });
    EXPECT_EQ(files(), 0u) << "refused, and nothing new to write";
}

TEST_F(BinaryCache, ProgramsOfOneFileNameNeverMeet) {
    // Two option texts of one 32-bit hash, by search: among n of them some two agree once n is near 2^16.
    std::unordered_map<uint32_t, std::string> seen;
    std::string first;
    std::string second;
    for (int i = 0; first.empty(); ++i) {
        second = " -D N=" + std::to_string(i);
        const auto [other, fresh] = seen.try_emplace(zor::oneAtATimeHash("Filters" + second, 0), second);
        if (!fresh) first = other->second;
    }
    ASSERT_EQ(binary(first), binary(second));
    EXPECT_TRUE(compiles(first));
    EXPECT_TRUE(compiles(second));
    EXPECT_FALSE(compiles(second));
    source = "kernel void k() {} // changed";
    EXPECT_TRUE(compiles(second));
    for (const auto& [deviceName, version] : {std::pair{"A.1", "2"}, std::pair{"A", "1.2"}}) {
        firstDevice().name = deviceName;
        firstDevice().driverVersion = version;
        EXPECT_TRUE(compiles(second)) << deviceName;
    }
    EXPECT_EQ(files(), 4u);
}

TEST_F(BinaryCache, WhatCannotBeNamedIsNotCached) {
    const struct {
        std::string device, driver, directory;
    } names[] = {
        {"GeForce/../Device", "1", "cache"}, {"Device", "1.0/2", "cache"}, {"Device", std::string(400, 'v'), "cache"},
        {"Device", "1", "one/two"},          {"Device", "1", "plain"},     {"Device", "1", ""}};
    writeText("plain", "");
    for (const auto& row : names) {
        firstDevice().name = row.device;
        firstDevice().driverVersion = row.driver;
        zor::setCacheDirectory(row.directory);
        device = makeDevice();
        if (row.directory == "cache")
            fs::create_directories(fs::path(name("Filters", " -D A").substr(0, 99)).parent_path());
        EXPECT_TRUE(compiles()) << row.device << row.driver << row.directory;
        EXPECT_THAT(lines, Not(HasSubstr("Cached file created"))) << row.device << row.driver << row.directory;
    }
}

// Writes beyond the limit fail as on a full disk, after a part has been written.
TEST_F(BinaryCache, AFileThatCannotBeWrittenWholeLeavesNothingBehind) {
    const std::string longSource = "kernel void k() {}" + std::string(100000, ' ');
    source = longSource;
    rlimit before{};
    ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &before), 0);
    const auto handler = std::signal(SIGXFSZ, SIG_IGN);
    for (const rlim_t bytes : {rlim_t{8192}, rlim_t{99999}}) {
        const rlimit limited = {bytes, before.rlim_max};
        ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &limited), 0);
        const bool compiled = compiles();
        setrlimit(RLIMIT_FSIZE, &before);
        EXPECT_TRUE(compiled);
        EXPECT_THAT(lines, Not(HasSubstr("Cached file created")));
        EXPECT_EQ(files(), 0u);
    }
    std::signal(SIGXFSZ, handler);
    fs::create_directories(binary() / "occupied");
    EXPECT_TRUE(compiles());
    EXPECT_EQ(files(), 1u) << "the side file alone";
}

TEST_F(BinaryCache, OfASourceFileIsComparedWithItAndItsDependencies) {
    const auto now = fs::file_time_type::clock::now();
    const std::string_view dependencies[] = {"missing.h", "used.h"};
    request = {.fileName = "own", .kernelName = "k", .dependencies = dependencies};
    printed([&] { EXPECT_EQ(device->getKernel(request), nullptr) << "there is no such file"; });
    writeText("own.cl", "kernel void k() {} // own");
    fs::last_write_time("own.cl", now - 1h);
    EXPECT_TRUE(compiles(std::nullopt));
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, readText("own.cl"));
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, "-I ..\\..\\");
    writeText("used.h", "");
    fs::last_write_time("used.h", now + 1h);
    EXPECT_TRUE(compiles(std::nullopt));
    fs::remove("used.h");
    fs::remove("own.cl");
    EXPECT_FALSE(compiles(std::nullopt)) << "its binary serves";
}

TEST_F(BinaryCache, AndPrintedNumbersDoNotDependOnTheHostsLocale) {
    const std::string large = "kernel void k() {}" + std::string(5000, ' ');  // a size that would be grouped
    source = large;
    const std::string before = name("abc", "");
    EXPECT_TRUE(compiles());
    ASSERT_EQ(std::system("localedef -i de_DE -f UTF-8 ./de_DE"), 0) << "the Debian package locales is missing";
    setenv("LOCPATH", folder.c_str(), 1);
    const std::locale plain = std::locale::global(std::locale("de_DE"));
    char sample[16];
    std::snprintf(sample, sizeof sample, "%.1f", 0.5);
    EXPECT_STREQ(sample, "0,5") << "the locale is what this test takes it for";
    EXPECT_FALSE(compiles());
    EXPECT_EQ(name("abc", ""), before);
    EXPECT_EQ(printed([&] { zor::Buffer<char>(*device, uint64_t{2000} << 20, zor::BUFFER_DEFAULT); }),
              "CL Memory Allocation Failure: 2000.00MB, Total used memory: 0.00MB\n");
    std::locale::global(plain);
    unsetenv("LOCPATH");
}
