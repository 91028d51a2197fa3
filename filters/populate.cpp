// Turns a row of the catalogue into a filter's parameters and passes.
#include "core/image_filter.h"  // upward: the filter is what gets filled
#include "filters/catalogue.h"

namespace {

const TovFilterParameter& require(TovImageFilter& filter, const char* name) {
    const TovFilterParameter* parameter = filter.find(name);
    if (parameter == nullptr) refuse(TOV_ERROR_INTERNAL_ERROR, std::string("The catalogue names no parameter ") + name);
    return *parameter;
}

void addOwnParameters(TovImageFilter& filter, TovFilterPass& pass) {
    for (const ParameterSpec& spec : filter.spec().parameters) pass.addArgument(require(filter, spec.name));
}

void addColorSpace(TovImageFilter& filter, TovFilterPass& pass, const char* name,
                   ColorSpaceConvertor::Direction direction) {
    pass.addInternalParameter(std::make_unique<ColorSpaceConvertor>(require(filter, name), direction));
}

void addItem(TovImageFilter& filter, TovFilterPass& pass, const PassItem& item) {
    const auto sourceSize = [&]() -> const TovFilterParameter& { return require(filter, "srcBufferSize"); };
    const auto destinationSize = [&]() -> const TovFilterParameter& { return require(filter, "dstBufferSize"); };
    switch (item.kind) {
        case PassItemKind::Argument:
            return pass.addArgument(require(filter, item.name));
        case PassItemKind::ReadBack:
            return pass.addArgument(require(filter, item.name), true);
        case PassItemKind::OwnParameters:
            return addOwnParameters(filter, pass);
        case PassItemKind::Scratch:
            return pass.addScratchArgument();
        case PassItemKind::State:
            return pass.addStateArgument(filter.stateBuffer());
        case PassItemKind::Define:
            return pass.addParameterDefine(item.name, require(filter, item.parameter));
        case PassItemKind::BuildOption:
            return pass.addBuildOption(item.name);
        case PassItemKind::ToXyz:
            return addColorSpace(filter, pass, item.name, ColorSpaceConvertor::TO_XYZ);
        case PassItemKind::FromXyz:
            return addColorSpace(filter, pass, item.name, ColorSpaceConvertor::FROM_XYZ);
        case PassItemKind::Ratio:
            return pass.addInternalParameter(std::make_unique<RatioConverter>(sourceSize(), destinationSize()));
        case PassItemKind::RatioDefines:
            return pass.addDefine(std::make_unique<RatioToDefConverter>(sourceSize(), destinationSize()));
        case PassItemKind::GaussianCoefficients:
            return pass.addDefine(
                std::make_unique<GaussianCoeffsGenerator>(require(filter, "sigma"), require(filter, "radius")));
        case PassItemKind::ViewProjectionPair:
            return pass.addInternalParameter(std::make_unique<ViewProjectionSwapper>(require(filter, item.name)));
    }
}

void createState(TovImageFilter& filter) {
    const FilterSpec& spec = filter.spec();
    if (!spec.hasState) return;
    if (spec.stateContents == nullptr) return filter.createStateBuffer(nullptr, 1);
    const std::span<const uint8_t> contents = spec.stateContents();
    filter.createStateBuffer(contents.data(), contents.size());
}

}  // namespace

void populate(TovImageFilter& filter) {
    for (const ParameterSpec& spec : filter.spec().parameters) filter.addParameter(spec);
    createState(filter);
    for (const PassSpec& spec : filter.spec().passes) {
        TovFilterPass& pass = filter.addPass(spec.program, spec.kernel, spec.grid2D);
        for (const PassItem& item : spec.items) addItem(filter, pass, item);
        pass.setLocalSize(spec.localSize[0], spec.localSize[1]);
    }
}
