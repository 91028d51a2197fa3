// Every kernel of the nine embedded programs with its parameters as they are written, and whether it can be fused.
#pragma once

#include <vector>

struct KernelEntry {
    const char* program;
    const char* kernel;
    const char* parameters;  // as the parser writes them back, joined with bars
    bool fusable;
};

inline const std::vector<KernelEntry>& kernelCatalogue() {
    static const std::vector<KernelEntry> entries = {
        {"Filters", "MathTestKernel", "__global float* srcBuffer|__global float* dstBuffer", false},
        {"Filters", "NormalizationKernel", "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)", true},
        {"Filters", "GammaCorrectionKernel", "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|float cGamma", true},
        {"Filters", "ColorSpaceKernel",
         "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|Mat4n3 cRgb2Xyz|Mat4n3 cXyz2Rgb", true},
        {"Filters", "SimpleToneMappingKernel",
         "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|float cExposure|float cContrast|int cApplyToneMap", true},
        {"Filters", "ReinhardToneMappingKernel",
         "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|float cKey|float cWPoint|float cBurn", true},
        {"Filters", "DragoToneMappingKernel",
         "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|float cBias|float avLum|float maxLum", true},
        {"Filters", "LinearToneMappingKernel", "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|float cKey", true},
        {"Filters", "ExponentialToneMappingKernel",
         "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|float cExposure|float cIntensity", true},
        {"Filters", "SobelOperatorKernel", "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)", true},
        {"Filters", "ShadowCatcherKernel", "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)", true},
        {"Math", "WeightedSumKernel",
         "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|IMAGE_ARRAY input|REPEAT INPUTS_NUM", true},
        {"Math", "MultiplicationKernel", "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|IMAGE_ARRAY input", true},
        {"GaussBlur", "GaussBlurHorKernel", "srcBufferType(srcBuffer)|dst_float_4 dstBuffer", false},
        {"GaussBlur", "GaussBlurVertKernel", "src_float_4 srcBuffer|dstBufferType(dstBuffer)", false},
        {"Resample", "ResampleKernel",
         "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|int2 cSrcRes|int2 cDstRes|float2 cRatio", true},
        {"BilateralDenoiser", "BilateralFilterKernel",
         "srcBufferType(srcBuffer)|dstBufferType(dstBuffer)|IMAGE_ARRAY input|REPEAT INPUTS_NUM", false},
        {"EAWDenoiser", "EAWDenoiserKernel",
         "srcBufferType(srcBuffer)|srcBufferType(normalsBuff)|srcBufferType(depthBuff)|srcBufferType(transBuff)|"
         "srcBufferType(vColorBuff)|float colSigma|float normSigma|float dptSigma|float transSigma|"
         "dstBufferType(dstBuffer)|__global float2* variance",
         false},
        {"LWRDenoiser", "LWRDenoiserFirstPass",
         "srcBufferType(srcBuffer)|srcBufferType(vColorBuff)|srcBufferType(transBuff)|srcBufferType(vTransBuff)|"
         "srcBufferType(normalsBuff)|srcBufferType(vNormalsBuff)|srcBufferType(depthBuff)|srcBufferType(vDepthBuff)|"
         "int samples|int halfWindow|float bandwidthFactor|dstBufferType(dstBuffer)",
         false},
        {"MLAA", "EdgeDetectionMLAA",
         "srcBufferType(colorTex)|srcBufferType(mesh_id)|srcBufferType(normal)|srcBufferType(depthTex)|"
         "dst_float_4 out_buffer|float colorTreshold|float normalTreshold|float depthTreshold",
         false},
        {"MLAA", "BlendingWeightCalculationMLAA",
         "src_float_4 edgesTex|src_uint_2 areaTex|int2 cSrcRes|dst_float_4 out_buffer", false},
        {"MLAA", "NeighborhoodBlendingMLAA", "srcBufferType(colorTex)|dstBufferType(out_buffer)|src_float_4 blendTex",
         false},
        {"TemporalAccumulation", "GenerateMotionBuffer",
         "srcBufferType(positions)|dstBufferType(motion)|float16 prev_view_projection|float16 view_projection", true},
        {"TemporalAccumulation", "TemporalAccumulation",
         "srcBufferType(colors)|srcBufferType(positions)|srcBufferType(normals)|srcBufferType(meshIds)|"
         "srcBufferType(motions)|dstBufferType(outVariances)|dstBufferType(outColors)|__global float4* buff",
         false},
        {"TemporalAccumulation", "SwapOutToIn",
         "srcBufferType(positions)|srcBufferType(normals)|srcBufferType(meshIds)|__global float4* buff", false},
    };
    return entries;
}
