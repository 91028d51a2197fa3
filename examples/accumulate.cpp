// Accumulates the frames of a rendered sequence under a moving camera, then removes the noise that is left.
//
//     accumulate FOLDER [OUTPUT-PREFIX]
//
// FOLDER holds beauty_00.exr, position_00.exr, normal_00.exr, meshid_00.exr, albedo_00.exr, depth_00.exr and so on, and
// camera.json, of which the sixteen numbers after each "view_projection" are read, one camera per frame. With
// reference_NN.exr beside them it prints the gains in decibels. OUTPUT-PREFIX writes the filtered frames as
// PREFIX00.exr and so on.
#include <OpenImageIO/imageio.h>
#include <tov/tov.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using Matrix = std::array<float, 16>;

constexpr size_t kMostFrames = 100;  // the files' names have two digits

void check(int32_t code, const char* what) {
    if (code != TOV_SUCCESS) throw std::runtime_error(std::string(what) + " failed with code " + std::to_string(code));
}

class Object {
 public:
    Object() = default;
    Object(const Object&) = delete;
    Object& operator=(const Object&) = delete;
    ~Object() {
        if (handle_ != nullptr) tovObjectDelete(handle_);
    }
    tov_object* out() { return &handle_; }
    operator tov_object() const { return handle_; }  // NOLINT(google-explicit-constructor): stands for the handle

 private:
    tov_object handle_ = nullptr;
};

// RGBA floats, rows from the top; one channel is repeated.
struct Picture {
    uint32_t width = 0;
    uint32_t height = 0;
    std::vector<float> rgba;
};

Picture readPicture(const std::string& path) {
    const auto input = OIIO::ImageInput::open(path);
    if (!input) throw std::runtime_error("cannot read " + path);
    const OIIO::ImageSpec& spec = input->spec();
    const auto channels = static_cast<size_t>(spec.nchannels);
    Picture picture{static_cast<uint32_t>(spec.width), static_cast<uint32_t>(spec.height), {}};
    const size_t pixels = size_t{picture.width} * picture.height;
    std::vector<float> stored(pixels * channels);
    if (!input->read_image(0, 0, 0, spec.nchannels, OIIO::TypeDesc::FLOAT, stored.data()))
        throw std::runtime_error("cannot read " + path);
    picture.rgba.assign(pixels * 4, 1.0f);
    for (size_t i = 0; i < pixels; ++i)
        for (size_t c = 0; c < 4; ++c) {
            const size_t source = channels < 3 ? 0 : c;
            if (c < 3 || channels > 3) picture.rgba[4 * i + c] = stored[i * channels + source];
        }
    return picture;
}

void writePicture(const std::string& path, const Picture& picture) {
    const auto output = OIIO::ImageOutput::create(path);
    const OIIO::ImageSpec spec(static_cast<int>(picture.width), static_cast<int>(picture.height), 4,
                               OIIO::TypeDesc::HALF);
    if (!output || !output->open(path, spec) || !output->write_image(OIIO::TypeDesc::FLOAT, picture.rgba.data()) ||
        !output->close())
        throw std::runtime_error("cannot write " + path);
}

// The numbers of every "view_projection", row after row.
std::vector<Matrix> readCameras(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    const std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
    const std::string key = "\"view_projection\"";
    std::vector<Matrix> cameras;
    for (size_t at = text.find(key); at != std::string::npos; at = text.find(key, at)) {
        at += key.size();
        Matrix camera{};
        for (float& value : camera) {
            at = text.find_first_of("-0123456789", at);
            if (at == std::string::npos) throw std::runtime_error(path + " ends within a matrix");
            const auto [end, error] = std::from_chars(text.data() + at, text.data() + text.size(), value);
            if (error != std::errc()) throw std::runtime_error(path + " holds a number out of range");
            at = static_cast<size_t>(end - text.data());
        }
        cameras.push_back(camera);
    }
    if (cameras.empty()) throw std::runtime_error("no camera in " + path);
    return cameras;
}

// Signal to noise of what a screen shows: values clamped to 0 ... 1 and raised to 1 / 2.2.
double decibels(const Picture& picture, const Picture& reference) {
    if (picture.width != reference.width || picture.height != reference.height)
        throw std::runtime_error("a reference has another size than its frame");
    const auto shown = [](float value) { return std::pow(std::clamp(double{value}, 0.0, 1.0), 1.0 / 2.2); };
    double sum = 0.0;
    for (size_t i = 0; i < picture.rgba.size(); ++i)
        if (i % 4 != 3) sum += std::pow(shown(picture.rgba[i]) - shown(reference.rgba[i]), 2);
    return -10.0 * std::log10(sum / (0.75 * static_cast<double>(picture.rgba.size())));
}

std::unique_ptr<Object> newImage(tov_context context, const Picture& picture) {
    auto image = std::make_unique<Object>();
    const tov_image_desc desc = {picture.width, picture.height, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    check(tovContextCreateImage(context, &desc, picture.rgba.empty() ? nullptr : picture.rgba.data(), image->out()),
          "tovContextCreateImage");
    return image;
}

Picture download(tov_image image, uint32_t width, uint32_t height) {
    void* pixels = nullptr;
    check(tovImageMap(image, 0, &pixels), "tovImageMap");
    const auto* first = static_cast<const float*>(pixels);
    Picture picture{width, height, {first, first + size_t{width} * height * 4}};
    check(tovImageUnmap(image, pixels), "tovImageUnmap");
    return picture;
}

// The two filters, whose objects live as long as the sequence: the accumulation keeps its history.
class Sequence {
 public:
    explicit Sequence(tov_context context) : context_(context) {
        check(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, accumulation_.out()),
              "tovContextCreateImageFilter");
        check(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_EAW_DENOISE, denoiser_.out()),
              "tovContextCreateImageFilter");
        const std::pair<const char*, float> sigmas[] = {
            {"colorSigma", 4.0f}, {"normalSigma", 0.1f}, {"depthSigma", 1.0f}, {"transSigma", 0.2f}};
        for (const auto& [name, sigma] : sigmas) check(tovImageFilterSetParameter1f(denoiser_, name, sigma), name);
    }

    // Reads frame NN; gives the accumulated and the filtered picture.
    void process(const std::string& folder, const std::string& number, const Matrix& camera, const Picture& beauty,
                 Picture& accumulated, Picture& filtered) {
        const Picture blank{beauty.width, beauty.height, {}};
        const auto color = newImage(context_, beauty);
        const auto sum = newImage(context_, blank);
        const auto variance = newImage(context_, blank);
        const auto result = newImage(context_, blank);
        std::vector<std::unique_ptr<Object>> features;
        const auto bind = [&](const Object& filter, const char* parameter, const char* name) {
            features.push_back(newImage(context_, readPicture(folder + "/" + name + "_" + number + ".exr")));
            check(tovImageFilterSetParameterImage(filter, parameter, *features.back()), parameter);
        };
        bind(accumulation_, "positionsImg", "position");
        bind(accumulation_, "normalsImg", "normal");
        bind(accumulation_, "meshIdsImg", "meshid");
        check(tovImageFilterSetParameterImage(accumulation_, "outVarianceImg", *variance), "outVarianceImg");
        check(tovImageFilterSetParameter16f(accumulation_, "viewProjMatrix", camera.data()), "viewProjMatrix");
        run(accumulation_, *color, *sum);
        accumulated = download(*sum, beauty.width, beauty.height);

        bind(denoiser_, "normalsImg", "normal");
        bind(denoiser_, "depthImg", "depth");
        bind(denoiser_, "transImg", "albedo");
        check(tovImageFilterSetParameterImage(denoiser_, "colorVar", *variance), "colorVar");
        run(denoiser_, *sum, *result);
        filtered = download(*result, beauty.width, beauty.height);
    }

 private:
    void run(const Object& filter, const Object& input, const Object& output) {
        Object queue;
        check(tovContextCreateCommandQueue(context_, queue.out()), "tovContextCreateCommandQueue");
        check(tovCommandQueueAttachImageFilter(queue, filter, input, output), "tovCommandQueueAttachImageFilter");
        check(tovContextExecuteCommandQueue(context_, queue, nullptr, nullptr), "tovContextExecuteCommandQueue");
    }

    tov_context context_;
    Object accumulation_;
    Object denoiser_;
};

void processAll(const std::string& folder, const std::string& prefix) {
    const std::vector<Matrix> cameras = readCameras(folder + "/camera.json");
    if (cameras.size() > kMostFrames) throw std::runtime_error("more frames than two digits can number");
    Object context;
    check(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, 0, nullptr, context.out()),
          "tovCreateContext");
    Sequence sequence(context);
    for (size_t i = 0; i < cameras.size(); ++i) {
        const std::string number = {static_cast<char>('0' + i / 10), static_cast<char>('0' + i % 10)};
        const Picture beauty = readPicture(folder + "/beauty_" + number + ".exr");
        Picture accumulated;
        Picture filtered;
        sequence.process(folder, number, cameras[i], beauty, accumulated, filtered);
        if (!prefix.empty()) writePicture(prefix + number + ".exr", filtered);
        const std::string reference = folder + "/reference_" + number + ".exr";
        if (!std::filesystem::exists(reference)) continue;
        const Picture truth = readPicture(reference);
        const double before = decibels(beauty, truth);
        std::printf("frame %s: %.2f dB, accumulated %+.2f, denoised %+.2f\n", number.c_str(), before,
                    decibels(accumulated, truth) - before, decibels(filtered, truth) - before);
    }
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2 && argc != 3) {
        std::fputs("usage: accumulate FOLDER [OUTPUT-PREFIX]\n", stderr);
        return 2;
    }
    try {
        processAll(argv[1], argc == 3 ? argv[2] : "");
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "accumulate: %s\n", failure.what());
        return 1;
    }
    return 0;
}
