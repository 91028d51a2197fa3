// Small pictures written and read with OpenImageIO, without the tool's own reader and writer.
#ifndef TOV_TESTS_TOOL_TEST_PICTURES_H
#define TOV_TESTS_TOOL_TEST_PICTURES_H

#include <OpenImageIO/imageio.h>

#include <string>
#include <vector>

namespace tooltest {

struct Stored {
    int width = 0;
    int height = 0;
    std::vector<std::string> channels;
    std::vector<float> values;  // channels side by side; 8-bit values as 0 ... 1
    OIIO::TypeDesc type;        // as stored
};

// A pattern of a few values from 0 to 1 that the type holds exactly.
Stored pattern(int width, int height, const std::vector<std::string>& channels, OIIO::TypeDesc type);

void store(const std::string& path, const Stored& picture);
Stored load(const std::string& path);

}  // namespace tooltest

#endif
