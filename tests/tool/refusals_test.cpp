// What the tool refuses, with which message and which exit status.
#include "tool_test.h"

using Refusals = Tool;

TEST_F(Refusals, HaveAStatusAndAMessageAndLeaveTheOldFileAndNothingElse) {
    store("a.exr", {8, 6, kRgb, {1}});
    store("small.exr", {4, 3, kRgb, {1}});
    store("layers.exr", {8, 6, {"N.X", "N.Y", "N.Z", "UV.U"}, {1}});
    expect(0, "", "run $R -f linear_tonemap -o cut.exr");
    fs::resize_file("cut.exr", fs::file_size("cut.exr") * 6 / 10);
    ASSERT_EQ(std::system("echo old >out.png; echo P6 100000 100000 255 >huge.ppm"), 0);
    const std::tuple<const char*, int, const char*> rows[] = {
        {"$RUN gama_correction", 2, "did you mean gamma_correction?"},
        {"$RUN gamma_correction:cGamma=1,5", 2, "param=value"},
        {"$RUN gamma_correction:cGamma=nan", 2, "not a finite number"},
        {"$RUN gamma_correction:cGamma=0", 1, "TOV_ERROR_INVALID_PARAMETER (-12)"},
        {"$RUN multiply:inputs=a.exr+small.exr", 2, "small.exr has 4 x 3 pixels"},
        {"$RUN mlaa:normalsImg=layers.exr:M", 4, "its layers are N, UV"},
        {"run a.exr -f sobel -o missing/out.png", 5, "No such file or directory"},
        {"$RUN sobel --device cpu:99", 3, "cpu:0"},
        {"run -f sobel -o out.png cut.exr", 4, "cannot read cut.exr"},
        {"run -f sobel -o out.png /dev/zero", 4, "not a regular file"},
        {"run -f sobel -o out.png huge.ppm", 1, "160000000000 bytes; at most 4294967295"},
        {"denoise a.exr -o out.png --albedo small.exr", 2, "small.exr has 4 x 3 pixels"},
        {"denoise a.exr -o out.png --method lwr --samples 1", 2, "--samples: at least 2"},
        {"denoise a.exr -o out.png --method lwr --samples 65537", 2, "--samples: at most 65536"}};
    for (const auto& [arguments, status, message] : rows)
        expect(status, message, arguments, "RUN='run a.exr -o out.png -f';");
    EXPECT_EQ(readFile("out.png"), "old\n");
    EXPECT_EQ(std::distance(fs::directory_iterator("."), {}), 6) << "what was there before";
}

TEST_F(Refusals, TellTheBytesThatABigPictureNeedsAndTheDeviceHas) {
    store("big.png", {4800, 4800, {"Y"}, {0}, OIIO::TypeDesc::UINT8});
    // GiB, of which the library keeps 256 MiB.
    for (const char* part : {"need 737280000 bytes (two images of 368640000)", " bytes are available (two images of "})
        expect(1, part, "run big.png -f linear_tonemap -o out.png", "POCL_MEMORY_LIMIT=1");
}
