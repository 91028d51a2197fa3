// Turns a row of the catalogue into a filter's parameters and passes.
#include "core/image_filter.h"  // upward: the filter is what gets filled
#include "filters/catalogue.h"

namespace {

TovFilterParameter& require(TovImageFilter& filter, const char* name) {
    TovFilterParameter* parameter = filter.find(name);
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
    const auto sourceSize = [&]() -> TovFilterParameter& { return require(filter, "srcBufferSize"); };
    const auto destinationSize = [&]() -> TovFilterParameter& { return require(filter, "dstBufferSize"); };
    switch (item.kind) {
        case PassItemKind::Argument:
            pass.addArgument(require(filter, item.name));
            break;
        case PassItemKind::ReadBack:
            pass.addArgument(require(filter, item.name), true);
            break;
        case PassItemKind::OwnParameters:
            addOwnParameters(filter, pass);
            break;
        case PassItemKind::Scratch:
            pass.addScratchArgument();
            break;
        case PassItemKind::State:
            pass.addStateArgument(filter.stateBuffer());
            break;
        case PassItemKind::Define:
            pass.addParameterDefine(item.name, require(filter, item.parameter));
            break;
        case PassItemKind::BuildOption:
            pass.addBuildOption(item.name);
            break;
        case PassItemKind::ToXyz:
            addColorSpace(filter, pass, item.name, ColorSpaceConvertor::TO_XYZ);
            break;
        case PassItemKind::FromXyz:
            addColorSpace(filter, pass, item.name, ColorSpaceConvertor::FROM_XYZ);
            break;
        case PassItemKind::Ratio:
            pass.addInternalParameter(std::make_unique<RatioConverter>(sourceSize(), destinationSize()));
            break;
        case PassItemKind::RatioDefines:
            pass.addDefine(std::make_unique<RatioToDefConverter>(sourceSize(), destinationSize()));
            break;
        case PassItemKind::GaussianCoefficients:
            pass.addDefine(
                std::make_unique<GaussianCoeffsGenerator>(require(filter, "sigma"), require(filter, "radius")));
            break;
        case PassItemKind::ViewProjectionPair:
            pass.addInternalParameter(std::make_unique<ViewProjectionSwapper>(require(filter, item.name)));
            break;
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
