// Opening the OpenCL library and what it may lack. This program's own dlopen stands before the system's.
#include <dlfcn.h>

#include "fixture.h"

static bool hasLibrary = true;
static std::string opened;

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

TEST_F(Loader, NamesTheCallThatTheLibraryLacksAndTheStatusOfOneThatFailed) {
    EXPECT_STREQ(zor::openCLErrorString(-68), "CL_INVALID_DEVICE_PARTITION_COUNT");
    for (const int32_t status : {-69, 1, INT32_MIN})
        EXPECT_STREQ(zor::openCLErrorString(status), "Unknown OpenCL error");
    printed();
    EXPECT_THROW(zor::check(-5, "clFinish"), zor::Error);
    EXPECT_THROW(device->flush(), zor::Error);
    EXPECT_EQ(printed(), "clFinish: CL_OUT_OF_RESOURCES (-5)\nclFlush: missing from the OpenCL library\n");
}
