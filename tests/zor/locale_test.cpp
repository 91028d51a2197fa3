// A host's locale with decimal commas and grouped digits changes no printed number, name or hash.
#include <clocale>
#include <locale>

#include "fixture.h"

namespace {

struct Grouped : std::numpunct<char> {
    char do_decimal_point() const override { return ','; }
    char do_thousands_sep() const override { return '.'; }
    std::string do_grouping() const override { return "\3"; }
};

// Makes a German locale in the folder where the system has none; false where that cannot be had.
bool setCommaLocale(const fs::path& folder) {
    const std::string name = (folder / "de_DE").string();
    const std::string command = "localedef -i de_DE -f ISO-8859-1 '" + name + "' >/dev/null 2>&1";
    if (std::setlocale(LC_ALL, "de_DE.UTF-8") != nullptr) return true;
    if (std::system(command.c_str()) != 0) return false;
    setenv("LOCPATH", folder.c_str(), 1);
    return std::setlocale(LC_ALL, "de_DE") != nullptr;
}

}  // namespace

class CommaLocale : public OnStandin {
 protected:
    void SetUp() override {
        OnStandin::SetUp();
        before_ = std::locale::global(std::locale(std::locale::classic(), new Grouped));
        comma_ = setCommaLocale(folder);
    }
    void TearDown() override {
        std::setlocale(LC_ALL, "C");
        unsetenv("LOCPATH");
        std::locale::global(before_);
        OnStandin::TearDown();
    }
    bool comma_ = false;

 private:
    std::locale before_;
};

TEST_F(CommaLocale, ChangesNoPrintedNumberAndNoFileName) {
    char sample[16];
    std::snprintf(sample, sizeof sample, "%.1f", 0.5);
    EXPECT_STREQ(sample, comma_ ? "0,5" : "0.5") << "the C locale is what this test takes it for";
    firstDevice().workGroupSize = 1234567;
    const DeviceOwner device = makeDevice();
    EXPECT_THAT(lines, testing::HasSubstr("CL_DEVICE_MAX_WORK_GROUP_SIZE  : 1234567\n"));
    EXPECT_EQ(zor::binaryFileName(opencl(device), "abc", ""), "cache/abc-ed131f5b.v.0.Stand-in GPU.1.0_64.bin");
    const std::string line = printed([&] { zor::Buffer<char>(*device, uint64_t{2000} << 20, zor::BUFFER_DEFAULT); });
    EXPECT_EQ(line, "CL Memory Allocation Failure: 2000.00MB, Total used memory: 0.00MB\n");
    if (!comma_) GTEST_SKIP() << "the C++ locale was checked; a C locale with a comma needs the Debian package locales";
}

TEST_F(CommaLocale, AProgramCachedUnderOneLocaleIsFoundUnderAnother) {
    const std::string_view source = "kernel void k() {}";
    const std::string large = source.data() + std::string(5000, ' ');  // a size that would be grouped
    const std::string_view text = large;
    const auto build = [&] {
        const DeviceOwner device = makeDevice();
        EXPECT_NE(device->getKernel({.fileName = "f", .kernelName = "k", .options = "", .sources = {&text, 1}}),
                  nullptr);
    };
    build();
    std::setlocale(LC_ALL, "C");
    std::locale::global(std::locale::classic());
    build();
    EXPECT_EQ(driver().callCount("clCreateProgramWithSource"), 1u);
}
