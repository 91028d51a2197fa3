// The binary cache: names, ages, what may be used, what is written, and how it fails.
#include <sys/resource.h>
#include <sys/stat.h>

#include <chrono>
#include <csignal>
#include <unordered_map>

#include "fixture.h"
#include "self_process.h"
#include "zor/cache_store.h"
#include "zor/file_time.h"

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

TEST(OneAtATimeHash, MatchesItsPublishedValuesAndTakesBytesAsSigned) {
    EXPECT_EQ(zor::oneAtATimeHash("", 0), 0u);
    EXPECT_EQ(zor::oneAtATimeHash("abc", 0), 0xed131f5bu);
    EXPECT_EQ(zor::oneAtATimeHash("a", 0), 0xca2e9442u);
    EXPECT_NE(zor::oneAtATimeHash("a", 1), zor::oneAtATimeHash("a", 0));
    // The byte 0xE9 is -23: ((h = -23) * 1025) ^ the same shifted right by 6, then the closing three steps.
    uint32_t hash = static_cast<uint32_t>(-23) * 1025u;
    hash ^= hash >> 6;
    hash *= 9u;
    hash ^= hash >> 11;
    EXPECT_EQ(zor::oneAtATimeHash("\xE9", 0), hash * 32769u);
}

class BinaryCache : public OnStandin {
 protected:
    void SetUp() override {
        OnStandin::SetUp();
        device = makeDevice();
    }
    void TearDown() override {
        device.reset();
        OnStandin::TearDown();
    }

    // Looks the kernel up on a fresh device, so that the map in memory holds nothing. True when it was compiled.
    bool compiles(std::optional<std::string_view> options = " -D A",
                  std::span<const std::string_view> dependencies = {}, bool keepInCache = true) {
        device.reset();
        device = makeDevice();
        const size_t before = driver().callCount("clCreateProgramWithSource");
        zor::Kernel* kernel = nullptr;
        lines = printed([&] {
            kernel = device->getKernel({.fileName = fileName,
                                        .kernelName = "k",
                                        .options = options,
                                        .sources = {&source, 1},
                                        .dependencies = dependencies,
                                        .keepInCache = keepInCache});
        });
        EXPECT_NE(kernel, nullptr);
        return driver().callCount("clCreateProgramWithSource") > before;
    }
    fs::path binary(std::optional<std::string_view> options = " -D A") {
        return folder / zor::binaryFileName(opencl(device), fileName, options);
    }
    fs::path sideFile() { return binary().string() + ".options"; }

    DeviceOwner device;
    std::string fileName = "Filters";
    std::string_view source = "kernel void k() {}";
};

TEST_F(BinaryCache, NamesFilesAfterDirectoryBaseNameHashDeviceAndDriver) {
    const auto name = [&](std::string_view file, std::optional<std::string_view> options) {
        return zor::binaryFileName(opencl(device), file, options);
    };
    EXPECT_EQ(name("abc", ""), "cache/abc-ed131f5b.v.0.Stand-in GPU.1.0_64.bin");
    EXPECT_EQ(name("../Tovkit/Impl/CL/Filters", std::nullopt), "cache/Filters-0x0.v.0.Stand-in GPU.1.0_64.bin");
    EXPECT_EQ(name("", " -D A"), "cache/-0x0.v.0.Stand-in GPU.1.0_64.bin");
    EXPECT_EQ(name("C:\\kernels\\Math", std::nullopt).substr(0, 15), "cache/Math-0x0.");
    EXPECT_EQ(name("a/b\\c", std::nullopt).substr(0, 12), "cache/c-0x0.");
    EXPECT_EQ(name("a\\b/c", std::nullopt).substr(0, 12), "cache/c-0x0.");
    EXPECT_NE(name("abc", " -D A"), name("abc", " -D B"));
    EXPECT_NE(name("x/abc", " -D A"), name("y/abc", " -D A")) << "the hash takes the whole name";
}

TEST(CacheDirectory, IsCutAtItsBuffer) {
    zor::setCacheDirectory(std::string(300, 'd'));
    EXPECT_EQ(zor::cacheDirectory(), std::string(127, 'd'));
    zor::setCacheDirectory("short");
    EXPECT_STREQ(zor::cacheDirectory(), "short");
}

TEST_F(BinaryCache, ASecondProgramOfTheSameInputsComesFromDisk) {
    EXPECT_TRUE(compiles());
    EXPECT_EQ(lines, "File not found cache/" + binary().filename().string() + "\nCached file created cache/" +
                         binary().filename().string() + "\n");
    EXPECT_EQ(cacheFiles(), (std::vector<std::string>{binary().filename(), sideFile().filename()}));
    EXPECT_FALSE(compiles());
    EXPECT_EQ(lines, "File not found Filters.cl\n");
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, " -D A") << "the binary is built with the same options";
    EXPECT_EQ(driver().lastCall("clCreateProgramWithBinary").text, readText(binary())) << "the driver's bytes alone";
    EXPECT_TRUE(compiles(" -D B"));
    EXPECT_EQ(cacheFiles().size(), 4u);
}

TEST_F(BinaryCache, AbsentOptionsHaveAFileOfTheirOwn) {
    EXPECT_TRUE(compiles(std::nullopt));
    EXPECT_THAT(cacheFiles()[0], HasSubstr("Filters-0x0."));
    EXPECT_FALSE(compiles(std::nullopt));
}

TEST_F(BinaryCache, WithoutAFileNameNothingIsCached) {
    fileName.clear();
    EXPECT_TRUE(compiles());
    EXPECT_EQ(lines, "");
    EXPECT_FALSE(fs::exists("cache"));
}

TEST_F(BinaryCache, WithoutKeepInCacheTheBinaryIsWrittenButNotRead) {
    EXPECT_TRUE(compiles(" -D A", {}, false));
    fs::remove(sideFile());
    EXPECT_TRUE(compiles(" -D A", {}, false));
    EXPECT_TRUE(fs::exists(sideFile()));
    EXPECT_EQ(driver().callCount("clCreateProgramWithBinary"), 0u);
    EXPECT_FALSE(compiles());
}

TEST_F(BinaryCache, AProgramToBeWrittenAfterItsRunIsWrittenByTheFirstLaunchThatSucceeds) {
    zor::Kernel* const kernel = device->getKernel(
        {.fileName = fileName, .kernelName = "k", .options = " -D A", .sources = {&source, 1}, .writeAfterRun = true});
    ASSERT_NE(kernel, nullptr);
    const auto launch = [&] { zor::Launcher(*device, *kernel).launch2D(8, 8, 8, 8); };
    driver().fail("clEnqueueNDRangeKernel", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(launch(), zor::Error);
    EXPECT_THAT(cacheFiles(), IsEmpty());
    EXPECT_EQ(printed(launch), "Cached file created cache/" + binary().filename().string() + "\n");
    EXPECT_EQ(printed(launch), "");
    EXPECT_EQ(driver().liveObjects("program"), 0u) << "the kernel alone keeps its program alive again";
    EXPECT_FALSE(compiles());
}

TEST_F(BinaryCache, ADeletedDirectoryIsMadeAgain) {
    EXPECT_TRUE(compiles());
    fs::remove_all("cache");
    EXPECT_TRUE(compiles());
    EXPECT_THAT(lines, HasSubstr("File not found cache/"));
    EXPECT_THAT(lines, HasSubstr("Cached file created cache/"));
    EXPECT_EQ(cacheFiles().size(), 2u);
}

TEST_F(BinaryCache, ANewerFileBesideTheNameOfAnEmbeddedTextMakesTheBinaryStale) {
    EXPECT_TRUE(compiles());
    writeText("Filters.cl", "never read");
    const auto time = fs::last_write_time(binary());
    fs::last_write_time("Filters.cl", time - 1s);
    EXPECT_FALSE(compiles());
    fs::last_write_time("Filters.cl", time);
    EXPECT_TRUE(compiles()) << "equal times are not current";
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, source);
    fs::last_write_time("Filters.cl", fs::last_write_time(binary()) + 1s);
    EXPECT_TRUE(compiles());
}

TEST_F(BinaryCache, DependenciesThatExistMustBeOlder) {
    const std::string_view dependencies[] = {"missing.h", "common.cl"};
    EXPECT_TRUE(compiles(" -D A", dependencies));
    writeText("common.cl", "");
    fs::last_write_time("common.cl", fs::last_write_time(binary()) - 1s);
    EXPECT_FALSE(compiles(" -D A", dependencies));
    EXPECT_THAT(lines, Not(HasSubstr("missing.h")));
    fs::last_write_time("common.cl", fs::last_write_time(binary()) + 1s);
    EXPECT_TRUE(compiles(" -D A", dependencies));
}

TEST_F(BinaryCache, FreshnessSaysWhyAFileCannotBeOpened) {
    writeText("file", "");
    mkfifo("pipe", 0600);
    const auto answer = [&](const char* path, const char* reference) {
        return printed([&] { EXPECT_FALSE(zor::isFileUpToDate(path, reference)); });
    };
    EXPECT_EQ(answer("none", "file"), "File not found none\n");
    EXPECT_EQ(answer("none/deep", "file"), "File not found none/deep\n");
    EXPECT_EQ(answer("file/below", "file"), "File path not found file/below\n");
    EXPECT_EQ(answer("pipe", "file"), "Failed reading file with errorCode = 22\npipe\n") << "opening would block";
    EXPECT_TRUE(zor::isFileUpToDate("file", "none"));
}

TEST_F(BinaryCache, ABinaryThatTheDriverRefusesIsDeletedCompiledAndWrittenAfresh) {
    EXPECT_TRUE(compiles());
    const auto first = fs::last_write_time(binary());
    driver().refuseBinaries = true;
    EXPECT_TRUE(compiles());
    EXPECT_GT(fs::last_write_time(binary()), first);
    driver().refuseBinaries = false;
    driver().fail("clBuildProgram", CL_INVALID_BINARY);
    EXPECT_TRUE(compiles()) << "accepted, then not built";
    EXPECT_FALSE(compiles());
    driver().refuseBinaries = true;
    source = "kernel void k() {}";
    driver().failBuilds = true;
    EXPECT_EQ(
        device->getKernel({.fileName = fileName, .kernelName = "k2", .options = " -D A", .sources = {&source, 1}}),
        nullptr);
    EXPECT_TRUE(cacheFiles().empty()) << "refused, and nothing new to write";
}

TEST_F(BinaryCache, DamagedFilesNeverReachTheDriver) {
    const auto damage = [&](const char* what, auto change) {
        EXPECT_TRUE(compiles()) << what;
        const size_t seen = driver().callCount("clCreateProgramWithBinary");
        change();
        EXPECT_TRUE(compiles()) << what;
        EXPECT_EQ(driver().callCount("clCreateProgramWithBinary"), seen) << what;
        EXPECT_FALSE(compiles()) << what;
        fs::remove_all("cache");
    };
    damage("truncated", [&] { fs::resize_file(binary(), fs::file_size(binary()) - 1); });
    damage("emptied", [&] { fs::resize_file(binary(), 0); });
    damage("one byte changed", [&] {
        std::string bytes = readText(binary());
        bytes[bytes.size() / 2] ^= 1;
        writeText(binary(), bytes);
    });
    damage("side file lost", [&] { fs::remove(sideFile()); });
    damage("side file cut", [&] { fs::resize_file(sideFile(), 3); });
    damage("other options", [&] { writeText(sideFile(), " -D B" + readText(sideFile()).substr(5)); });
    damage("made a folder", [&] {
        fs::remove(sideFile());
        fs::create_directory(sideFile());
        fs::remove(sideFile());
    });
}

TEST_F(BinaryCache, OtherSourceTextsUnderTheSameNameAreOtherPrograms) {
    EXPECT_TRUE(compiles());
    source = "kernel void k() {} // changed";
    EXPECT_TRUE(compiles());
    EXPECT_FALSE(compiles());
    source = "kernel void k() {}";
    EXPECT_TRUE(compiles());
}

// Two option texts of one 32-bit hash, by search: among n of them some two agree once n is near 2^16.
std::pair<std::string, std::string> collidingOptions(const std::string& fileName) {
    std::unordered_map<uint32_t, std::string> seen;
    for (int i = 0;; ++i) {
        std::string options = " -D N=" + std::to_string(i);
        const auto [other, fresh] = seen.try_emplace(zor::oneAtATimeHash(fileName + options, 0), options);
        if (!fresh) return {other->second, options};
    }
}

TEST_F(BinaryCache, TwoOptionTextsOfOneHashNeverMeet) {
    const auto [first, second] = collidingOptions(fileName);
    ASSERT_EQ(binary(first), binary(second));
    EXPECT_TRUE(compiles(first));
    EXPECT_TRUE(compiles(second));
    EXPECT_FALSE(compiles(second));
    EXPECT_TRUE(compiles(first));
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, first);
}

TEST_F(BinaryCache, NoMixtureOfTwoWritersFilesIsUsed) {
    const auto [first, second] = collidingOptions(fileName);
    EXPECT_TRUE(compiles(first));
    const std::string side = binary(first).string() + ".options";
    const std::string binaryOfFirst = readText(binary(first));
    const std::string sideOfFirst = readText(side);
    EXPECT_TRUE(compiles(second));
    const std::string binaryOfSecond = readText(binary(first));
    writeText(side, sideOfFirst);
    EXPECT_TRUE(compiles(first));
    writeText(binary(first), binaryOfSecond);
    EXPECT_TRUE(compiles(first));
    EXPECT_EQ(driver().callCount("clCreateProgramWithBinary"), 0u);
    EXPECT_EQ(readText(binary(first)), binaryOfFirst);
    EXPECT_FALSE(compiles(first));
}

TEST_F(BinaryCache, DeviceAndDriverTextsThatRunTogetherInTheNameStayApart) {
    firstDevice().name = "A.1";
    firstDevice().driverVersion = "2";
    EXPECT_TRUE(compiles());
    firstDevice().name = "A";
    firstDevice().driverVersion = "1.2";
    EXPECT_TRUE(compiles());
    EXPECT_EQ(cacheFiles().size(), 2u);
}

TEST_F(BinaryCache, WhatCannotBeNamedIsNotCached) {
    const auto staysEmpty = [&](const char* what) {
        EXPECT_TRUE(compiles()) << what;
        EXPECT_THAT(lines, Not(HasSubstr("Cached file created"))) << what;
        EXPECT_TRUE(cacheFiles().empty()) << what;
    };
    fs::create_directories("cache/Filters-0x0.v.0.Device");
    fs::remove_all("cache/Filters-0x0.v.0.Device");
    firstDevice().name = "GeForce/../Device";
    staysEmpty("a slash in the device's name");
    firstDevice().name = "Device";
    firstDevice().driverVersion = "1.0/2";
    staysEmpty("a slash in the driver's version");
    firstDevice().driverVersion = std::string(400, 'v');
    staysEmpty("a name longer than the file system allows");
    firstDevice().driverVersion = "1";
    zor::setCacheDirectory("one/two");
    staysEmpty("two levels of directories");
    writeText("plain", "");
    zor::setCacheDirectory("plain");
    EXPECT_TRUE(compiles());
    EXPECT_THAT(lines, HasSubstr("File path not found plain/"));
    EXPECT_EQ(readText("plain"), "");
    zor::setCacheDirectory("");
    EXPECT_TRUE(compiles());
    EXPECT_EQ(lines, "");
}

// Writes beyond the limit fail as on a full disk, after a part has been written.
TEST_F(BinaryCache, AFileThatCannotBeWrittenWholeLeavesNothingBehind) {
    const std::string longSource = "kernel void k() {}" + std::string(100000, ' ');
    source = longSource;
    rlimit before{};
    ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &before), 0);
    const auto handler = std::signal(SIGXFSZ, SIG_IGN);
    for (const rlim_t bytes : {rlim_t{8192}, rlim_t{99999}}) {
        rlimit limited = before;
        limited.rlim_cur = bytes;
        ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &limited), 0);
        const bool compiled = compiles();
        setrlimit(RLIMIT_FSIZE, &before);
        EXPECT_TRUE(compiled);
        EXPECT_THAT(lines, Not(HasSubstr("Cached file created")));
        EXPECT_THAT(cacheFiles(), IsEmpty());
    }
    std::signal(SIGXFSZ, handler);
    EXPECT_TRUE(compiles());
    EXPECT_EQ(cacheFiles().size(), 2u);
}

TEST_F(BinaryCache, AnObstacleInTheBinarysPlaceLeavesNoSideFile) {
    fs::create_directories(binary() / "occupied");
    EXPECT_TRUE(compiles());
    EXPECT_THAT(cacheFiles(), ElementsAre(binary().filename().string()));
}

TEST_F(BinaryCache, AProgramWithoutABinaryIsUsedAndNotCached) {
    zor::CacheEntry entry;
    entry.path = "nowhere/x.bin";
    EXPECT_FALSE(zor::storeBinary(entry, "bytes"));
    EXPECT_FALSE(zor::loadBinary(entry));
    EXPECT_FALSE(fs::exists("nowhere"));
}

TEST_F(BinaryCache, ABinaryOlderThanTheLibraryIsNotCurrent) {
    EXPECT_TRUE(compiles());
    fs::last_write_time(binary(), fs::last_write_time(fs::read_symlink("/proc/self/exe")) - 1s);
    EXPECT_TRUE(compiles());
    EXPECT_FALSE(compiles());
}

// Runs in a process of its own, in the folder that is named in the environment.
TEST_F(BinaryCache, DISABLED_InAnotherProcess) {
    const char* const directory = std::getenv("ZOR_TEST_FOLDER");
    ASSERT_NE(directory, nullptr);
    fs::current_path(directory);
    const bool compiled = compiles();
    std::printf("\nresult: %s\n", compiled ? "compiled" : "loaded");
    fs::current_path(folder);
}

TEST_F(BinaryCache, ASecondProcessCompilesNothing) {
    EXPECT_TRUE(compiles());
    const std::string output = runTests("BinaryCache.DISABLED_InAnotherProcess", "ZOR_TEST_FOLDER=" + folder.string());
    EXPECT_THAT(output, HasSubstr("result: loaded"));
}

// An installer may keep the file's own, older modification time; that its status changed tells.
TEST_F(BinaryCache, ALibraryInstalledWithAnOldTimeIsAsOldAsItsInstallation) {
    EXPECT_TRUE(compiles());
    const fs::path copy = folder / "copy";
    fs::copy_file(fs::read_symlink("/proc/self/exe"), copy);
    const auto longAgo = fs::last_write_time(copy) - 24h * 3650;
    fs::last_write_time(copy, longAgo);
    fs::last_write_time(binary(), longAgo + 24h);
    const std::string environment = "ZOR_TEST_FOLDER=" + folder.string();
    EXPECT_THAT(runTests("BinaryCache.DISABLED_InAnotherProcess", environment, copy), HasSubstr("result: compiled"));
    EXPECT_THAT(runTests("BinaryCache.DISABLED_InAnotherProcess", environment, copy), HasSubstr("result: loaded"));
}

class FileBuilds : public BinaryCache {
 protected:
    zor::Kernel* get(std::optional<std::string_view> options = std::nullopt,
                     std::span<const std::string_view> dependencies = {}) {
        device.reset();
        device = makeDevice();
        zor::Kernel* kernel = nullptr;
        lines = printed([&] {
            kernel = device->getKernel(
                {.fileName = "own", .kernelName = "k", .options = options, .dependencies = dependencies});
        });
        return kernel;
    }
    size_t compilations() { return driver().callCount("clCreateProgramWithSource"); }
};

TEST_F(FileBuilds, CompileTheFileOnDiskOnceWithADefaultIncludePath) {
    writeText("own.cl", "kernel void k() {}");
    EXPECT_NE(get(), nullptr);
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, "kernel void k() {}");
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, "-I ..\\..\\");
    EXPECT_NE(get(), nullptr);
    EXPECT_EQ(compilations(), 1u);
    EXPECT_NE(get(" -D A"), nullptr);
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, " -D A");
}

TEST_F(FileBuilds, AChangedFileOrDependencyIsCompiledAgain) {
    const std::string_view dependencies[] = {"missing.h", "used.h"};
    writeText("own.cl", "kernel void k() {}");
    writeText("used.h", "");
    EXPECT_NE(get("", dependencies), nullptr);
    const auto later = fs::last_write_time("own.cl") + 10s;
    EXPECT_NE(get("", dependencies), nullptr);
    EXPECT_THAT(lines, HasSubstr("File not found missing.h\n"));
    EXPECT_EQ(compilations(), 1u);
    fs::last_write_time("used.h", later);
    EXPECT_NE(get("", dependencies), nullptr);
    EXPECT_EQ(compilations(), 2u);
    fs::last_write_time("used.h", later - 24h);
    fs::last_write_time("own.cl", later);
    EXPECT_NE(get("", dependencies), nullptr);
    EXPECT_EQ(compilations(), 3u);
}

TEST_F(FileBuilds, AMissingFileIsALineAndNoKernelUnlessItsBinaryIsThere) {
    EXPECT_EQ(get(), nullptr);
    EXPECT_THAT(lines, HasSubstr("Kernel not found own.cl\n"));
    writeText("own.cl", "kernel void k() {}");
    EXPECT_NE(get(), nullptr);
    fs::remove("own.cl");
    EXPECT_NE(get(), nullptr);
    EXPECT_EQ(compilations(), 1u);
}
