// Opening the OpenCL library and what it may lack. This program's own dlopen stands before the system's.
#include <dlfcn.h>

#include "fixture.h"

namespace {

bool hasLibrary = true;
std::string opened;

}  // namespace

extern "C" void* dlopen(const char* name, int flags) {
    using Open = void*(const char*, int);
    static auto* const real = reinterpret_cast<Open*>(dlsym(RTLD_NEXT, "dlopen"));
    if (name == nullptr || std::strncmp(name, "libOpenCL", 9) != 0) return real(name, flags);
    opened.append(name).append(" ");
    return hasLibrary ? real(name, flags) : nullptr;
}

class Loader : public OnStandin {};

TEST_F(Loader, OpensTheLibraryOnceByItsNameAndGivesUpAfterTheSecond) {
    device.reset();
    const auto reload = [](bool there) {
        zor::unloadOpenCL();
        opened.clear();
        hasLibrary = there;
        return zor::loadOpenCL();
    };
    EXPECT_EQ(reload(false), -1);
    EXPECT_EQ(opened, "libOpenCL.so.1 libOpenCL.so ");
    EXPECT_EQ(zor::getDeviceCount(false, zor::kAllVendors), 0u);
    EXPECT_THROW(makeDevice(), zor::Error);
    EXPECT_EQ(reload(true), 0);
    EXPECT_TRUE(zor::isDeviceKindAvailable(zor::DEVICE_KIND_CL));
    EXPECT_EQ(opened, "libOpenCL.so.1 ");
}

TEST_F(Loader, AnEntryPointThatIsMissingIsABrokenInvariantAndCopiesGoThroughTheHost) {
    auto& entryPoints = const_cast<zor::EntryPoints&>(zor::cl());
    const zor::EntryPoints all = entryPoints;
    entryPoints.clEnqueueCopyBuffer.set(nullptr);
    entryPoints.clFlush.set(nullptr);
    EXPECT_EQ(printed([&] { EXPECT_THROW(device->flush(), zor::Error); }),
              "clFlush: missing from the OpenCL library\n");
    const zor::Buffer<char> from(*device, 64, zor::BUFFER_DEFAULT);
    zor::Buffer<char> to(*device, 64, zor::BUFFER_DEFAULT);
    std::memset(standin::bytesOf(from.memory()), 'a', 64);
    to.copyFrom(from, 10);
    EXPECT_EQ(std::memcmp(standin::bytesOf(to.memory()), "aaaaaaaaaa\0", 12), 0);
    entryPoints = all;
}

TEST(OpenCLErrors, AreNamed) {
    const std::pair<int32_t, const char*> names[] = {{0, "CL_SUCCESS"},
                                                     {-19, "CL_KERNEL_ARG_INFO_NOT_AVAILABLE"},
                                                     {-20, ""},
                                                     {-29, ""},
                                                     {-30, "CL_INVALID_VALUE"},
                                                     {-68, "CL_INVALID_DEVICE_PARTITION_COUNT"},
                                                     {-69, "Unknown OpenCL error"},
                                                     {INT32_MIN, "Unknown OpenCL error"},
                                                     {-1001, "CL_PLATFORM_NOT_FOUND_KHR"}};
    for (const auto& [status, name] : names) EXPECT_STREQ(zor::openCLErrorString(status), name) << status;
    EXPECT_EQ(printed([] { EXPECT_THROW(zor::check(-5, "clFinish"), zor::Error); }),
              "clFinish: CL_OUT_OF_RESOURCES (-5)\n");
}
