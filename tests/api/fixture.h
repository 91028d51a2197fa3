// What the tests of the 27 functions share: the CPU device with a cache directory of its own, and one filter run from
// picture to picture.
#pragma once

#include <gtest/gtest.h>
#include <tov/tov.h>

#include <array>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "picture.h"

namespace apitest {

// Deletes its object when it goes.
class Handle {
 public:
    Handle() = default;
    Handle(Handle&& other) noexcept : object_(std::exchange(other.object_, nullptr)) {}
    Handle& operator=(Handle&& other) noexcept {
        std::swap(object_, other.object_);
        return *this;
    }
    ~Handle() { remove(); }

    operator tov_object() const { return object_; }  // NOLINT(google-explicit-constructor): stands for the handle
    tov_object* out() { return &object_; }
    // Deletes the object; the handle's value, no longer valid, comes back.
    tov_object remove() {
        if (object_ != nullptr) tovObjectDelete(object_);
        return std::exchange(object_, nullptr);
    }

 private:
    tov_object object_ = nullptr;
};

using Matrix = std::array<float, 16>;
// Arrays are set by their address: a list of parameters must live until the filter has run.
using Value = std::variant<uint32_t, float, Matrix, tov_image, std::vector<float>, std::vector<tov_image>>;
struct Parameter {
    const char* name;
    Value value;
};
using Parameters = std::vector<Parameter>;

int32_t setParameter(tov_image_filter filter, const Parameter& parameter);
// Sets values with which a filter of any type runs, of those that it has; the images must live until it ran.
void setAll(tov_image_filter filter, const std::vector<tov_image>& auxiliary);

// Standard output of a call, the library's diagnostics among it.
template <class Body>
std::string printedBy(Body&& body) {
    testing::internal::CaptureStdout();
    body();
    return testing::internal::GetCapturedStdout();
}

class DeviceTest : public testing::Test {
 protected:
    // Where TOV_TEST_DEVICE is set, the device's name must contain its text.
    void SetUp() override;

    // One context for the whole program; compiled kernels are shared by all suites.
    static tov_context context();
    static const std::filesystem::path& cacheDirectory();
    static Handle newContext();

    static Handle newImage(const tov_image_desc& desc, const void* data = nullptr, tov_context owner = context()) {
        return created(tovContextCreateImage, owner, &desc, data);
    }
    static Handle newImage(const Picture& picture, tov_context owner = context()) {
        return newImage(picture.desc(), picture.encoded().data(), owner);
    }
    static Handle newFilter(uint32_t type, const Parameters& parameters = {}, tov_context owner = context()) {
        Handle filter = created(tovContextCreateImageFilter, owner, type);
        for (const Parameter& parameter : parameters)
            EXPECT_EQ(setParameter(filter, parameter), TOV_SUCCESS) << type << " " << parameter.name;
        return filter;
    }
    static Handle newQueue(tov_context owner = context()) { return created(tovContextCreateCommandQueue, owner); }
    // The image's pixels, which has the layout of the picture.
    static Picture read(tov_image image, Picture like);

    // Attaches to a new queue and executes it.
    static int32_t execute(tov_image_filter filter, tov_image input, tov_image output);
    // The output of a filter, which is like the input or as given; a failure of any call is the test's.
    static Picture run(uint32_t type, const Picture& input, const Parameters& parameters = {},
                       const std::optional<Picture>& before = {});

    template <class Create, class... Arguments>
    static Handle created(Create* create, Arguments... arguments) {
        Handle object;
        EXPECT_EQ(create(arguments..., object.out()), TOV_SUCCESS);
        return object;
    }
};

}  // namespace apitest
