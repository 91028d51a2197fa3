// Our filters beside OpenCV's on the CPU device: the same picture, component type and threads, turn by turn in one run,
// so that both meet the same load of the machine. Reported are the smallest times and their quotient.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <exception>
#include <functional>
#include <memory>
#include <opencv2/imgproc.hpp>
#include <random>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "child.h"
#include "handle.h"
#include "measure.h"

namespace {

using namespace bench;

constexpr int kWidth = 1920;
constexpr int kHeight = 1080;
constexpr int kTurns = 9;

struct Value {
    const char* name;
    float number;  // whole numbers go to parameters of whole numbers, see isWhole
    bool isWhole = true;
};

tov_context context = nullptr;

tov_image_desc descOf(const cv::Mat& mat) {
    const uint32_t type = mat.depth() == CV_8U ? TOV_COMPONENT_TYPE_UINT8 : TOV_COMPONENT_TYPE_FLOAT32;
    return {static_cast<uint32_t>(mat.cols),
            static_cast<uint32_t>(mat.rows),
            1,
            0,
            0,
            static_cast<uint32_t>(mat.channels()),
            type};
}

// One filter of ours from a picture to another of the given size, ready to execute.
class Ours {
 public:
    Ours(uint32_t type, const cv::Mat& input, cv::Size outputSize, const std::vector<Value>& values) {
        tov_image_desc desc = descOf(input);
        input_ = image(desc, input.data);
        desc.image_width = static_cast<uint32_t>(outputSize.width);
        desc.image_height = static_cast<uint32_t>(outputSize.height);
        output_ = image(desc, nullptr);
        tov_object made = nullptr;
        check(tovContextCreateImageFilter(context, type, &made), "tovContextCreateImageFilter");
        filter_.reset(made);
        for (const Value& value : values) set(value);
        check(tovContextCreateCommandQueue(context, &made), "tovContextCreateCommandQueue");
        queue_.reset(made);
    }

    // The picture as the filter's one auxiliary image.
    void useInputAsFeature(float sigma) {
        sigma_ = sigma;
        feature_ = input_.get();
        check(tovImageFilterSetParameter1u(filter_.get(), "inputsNum", 1), "inputsNum");
        check(tovImageFilterSetParameterImageArray(filter_.get(), "inputs", &feature_, 1), "inputs");
        check(tovImageFilterSetParameterFloatArray(filter_.get(), "sigmas", &sigma_, 1), "sigmas");
    }

    void attach() {
        check(tovCommandQueueAttachImageFilter(queue_.get(), filter_.get(), input_.get(), output_.get()), "attach");
    }
    void execute() { check(tovContextExecuteCommandQueue(context, queue_.get(), nullptr, nullptr), "execute"); }

 private:
    static Handle image(const tov_image_desc& desc, const void* pixels) {
        tov_image made = nullptr;
        check(tovContextCreateImage(context, &desc, pixels, &made), "tovContextCreateImage");
        return Handle(made);
    }
    void set(const Value& value) {
        const int32_t code =
            value.isWhole ? tovImageFilterSetParameter1u(filter_.get(), value.name, static_cast<uint32_t>(value.number))
                          : tovImageFilterSetParameter1f(filter_.get(), value.name, value.number);
        check(code, value.name);
    }

    float sigma_ = 1.0f;
    tov_image feature_ = nullptr;
    Handle input_;
    Handle output_;
    Handle filter_;
    Handle queue_;
};

cv::Mat picture(int type) {
    cv::Mat values(kHeight, kWidth, CV_MAKETYPE(CV_32F, CV_MAT_CN(type)));
    std::mt19937 engine(7);
    std::uniform_real_distribution<float> uniform(0.0f, 1.0f);
    auto* value = values.ptr<float>();
    for (size_t i = 0; i < values.total() * static_cast<size_t>(values.channels()); ++i) value[i] = uniform(engine);
    cv::Mat result;
    values.convertTo(result, type, CV_MAT_DEPTH(type) == CV_8U ? 255.0 : 1.0);
    return result;
}

struct Pair {
    std::function<void()> ours;
    std::function<void()> opencv;
};
using MakePair = std::function<Pair()>;

void compare(benchmark::State& state, const MakePair& make) {
    const Pair pair = make();
    pair.ours();  // builds the kernels
    pair.opencv();
    std::vector<double> ours;
    std::vector<double> theirs;
    for (auto _ : state) {
        ours.push_back(secondsOf(pair.ours));
        theirs.push_back(secondsOf(pair.opencv));
        state.SetIterationTime(ours.back());
    }
    state.counters["tov_ms"] = 1e3 * minimum(ours);
    state.counters["opencv_ms"] = 1e3 * minimum(theirs);
    state.counters["times_faster"] = minimum(theirs) / minimum(ours);
}

void add(const std::string& name, MakePair make) {
    benchmark::RegisterBenchmark(name.c_str(), [make = std::move(make)](benchmark::State& s) { compare(s, make); })
        ->UseManualTime()
        ->Iterations(kTurns)
        ->Unit(benchmark::kMillisecond);
}

std::function<void()> executing(Ours&& made) {
    const auto ours = std::make_shared<Ours>(std::move(made));
    ours->attach();
    return [ours] { ours->execute(); };
}

const std::vector<std::pair<const char*, int>> kTypes = {{"float4", CV_32FC4}, {"uint8x4", CV_8UC4}};

void addBlurs() {
    for (const auto& [typeName, type] : kTypes) {
        for (const int radius : {1, 2, 3, 5, 10, 15, 31, 64}) {
            for (const int tiling : {0, 1}) {
                const auto make = [type = type, radius, tiling]() -> Pair {
                    const cv::Mat input = picture(type);
                    const float sigma = static_cast<float>(radius) / 3.0f + 0.3f;
                    const std::vector<Value> values = {{"radius", static_cast<float>(radius)},
                                                       {"sigma", sigma, false},
                                                       {"tiling", static_cast<float>(tiling)}};
                    return {executing(Ours(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, input, input.size(), values)),
                            [input, output = cv::Mat(), radius, sigma]() mutable {
                                const int side = 2 * radius + 1;
                                cv::GaussianBlur(input, output, {side, side}, double{sigma}, double{sigma},
                                                 cv::BORDER_REFLECT);
                            }};
                };
                add(std::string("gaussian_blur/") + typeName + "/radius:" + std::to_string(radius) +
                        (tiling != 0 ? "/tiled" : "/plain"),
                    make);
            }
        }
    }
}

void addResampling() {
    struct Operator {
        const char* name;
        uint32_t ours;
        int opencv;
        std::vector<cv::Size> sizes;
    };
    // OpenCV places pixel centres differently; the work is the same.
    const std::vector<Operator> operators = {
        {"box", TOV_INTERPOLATION_DOWNSAMPLE, cv::INTER_AREA, {{960, 540}, {480, 270}}},
        {"bilinear", TOV_INTERPOLATION_BILINEAR, cv::INTER_LINEAR, {{2560, 1440}, {1280, 720}}},
        {"bicubic", TOV_INTERPOLATION_BICUBIC, cv::INTER_CUBIC, {{2560, 1440}, {1280, 720}}}};
    for (const auto& [typeName, type] : kTypes) {
        for (const Operator& op : operators) {
            for (const cv::Size size : op.sizes) {
                const auto make = [type = type, op, size]() -> Pair {
                    const cv::Mat input = picture(type);
                    return {executing(Ours(TOV_IMAGE_FILTER_RESAMPLE, input, size,
                                           {{"interpOperator", static_cast<float>(op.ours)}})),
                            [input, output = cv::Mat(), op, size]() mutable {
                                cv::resize(input, output, size, 0, 0, op.opencv);
                            }};
                };
                add(std::string("resize/") + typeName + "/" + op.name + "/" + std::to_string(size.width), make);
            }
        }
    }
}

// Ours takes the gradient of the luminance and its length; OpenCV's two gradients of all channels and no length.
void addSobel() {
    for (const auto& [typeName, type] : kTypes) {
        const auto make = [type = type]() -> Pair {
            const cv::Mat input = picture(type);
            return {executing(Ours(TOV_IMAGE_FILTER_SOBEL, input, input.size(), {})),
                    [input, x = cv::Mat(), y = cv::Mat()]() mutable {
                        const int depth = input.depth() == CV_8U ? CV_16S : CV_32F;
                        cv::Sobel(input, x, depth, 1, 0, 3, 1, 0, cv::BORDER_REPLICATE);
                        cv::Sobel(input, y, depth, 0, 1, 3, 1, 0, cv::BORDER_REPLICATE);
                    }};
        };
        add(std::string("sobel/") + typeName, make);
    }
}

// Different algorithms: ours weights a square by an auxiliary image (here the picture itself) alone, OpenCV's a disc by
// colour and distance. OpenCV takes three channels, ours the same.
void addBilateral() {
    for (const auto& [typeName, type] : {std::pair{"float3", CV_32FC3}, std::pair{"uint8x3", CV_8UC3}}) {
        for (const int radius : {2, 5, 10}) {
            const auto make = [type = type, radius]() -> Pair {
                const cv::Mat input = picture(type);
                const std::vector<Value> values = {{"radius", static_cast<float>(radius)}};
                const auto ours =
                    std::make_shared<Ours>(TOV_IMAGE_FILTER_BILATERAL_DENOISE, input, input.size(), values);
                ours->useInputAsFeature(0.04f);  // the filter keeps the addresses of its arrays
                ours->attach();
                const double sigma = input.depth() == CV_8U ? 51.0 : 0.2;
                return {[ours] { ours->execute(); },
                        [input, output = cv::Mat(), radius, sigma]() mutable {
                            cv::bilateralFilter(input, output, 2 * radius + 1, sigma, 3.0, cv::BORDER_REPLICATE);
                        }};
            };
            add(std::string("bilateral/") + typeName + "/radius:" + std::to_string(radius), make);
        }
    }
}

int compareAll() {
    const TemporaryDirectory cache;
    check(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, 0, cache.path().c_str(),
                           &context),
          "tovCreateContext (these comparisons need an OpenCL device of type CPU)");
    const Handle owner(context);
    cv::setNumThreads(static_cast<int>(std::thread::hardware_concurrency()));
    addBlurs();
    addResampling();
    addSobel();
    addBilateral();
    return benchmark::RunSpecifiedBenchmarks() > 0 ? 0 : 1;
}

}  // namespace

int main(int argc, char** argv) {
    try {
        benchmark::Initialize(&argc, argv);
        return compareAll();
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "tov_opencv_comparison: %s\n", failure.what());
        return 1;
    }
}
