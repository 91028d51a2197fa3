// Texts of the filters and parameters that are too long for the catalogue's rows. Hosts show them as they stand.
#pragma once

inline constexpr char kSrcColorSpaceText[] =
    "The color space of the source image. By default TOV_COLOR_SPACE_SRGB used.Currently supported: "
    "TOV_COLOR_SPACE_SRGB, TOV_COLOR_SPACE_ADOBE_RGB, TOV_COLOR_SPACE_REC2020 and TOV_COLOR_SPACE_DCIP3";
inline constexpr char kDstColorSpaceText[] =
    "The color space of the destination image. By default TOV_COLOR_SPACE_SRGB used.Currently supported: "
    "TOV_COLOR_SPACE_SRGB, TOV_COLOR_SPACE_ADOBE_RGB, TOV_COLOR_SPACE_REC2020 and TOV_COLOR_SPACE_DCIP3";
inline constexpr char kBlurRadiusText[] =
    "The radius of the region that is used for blur. The larger the radius, the more blur can be obtained.";
inline constexpr char kBilateralText[] =
    "A bilateral filter is a non-linear, edge-preserving, and noise-reducing smoothing filter for images. It "
    "replaces the intensity of each pixel with a weighted average of intensity values from nearby pixels. ";
inline constexpr char kTransitionText[] =
    "Transition color image. Corresponds to the color of the objects without the use of the shading algorithms "
    "or the color of primary rays when tracing. The parameter is optional, but if used can improve borders "
    "preservation.";
inline constexpr char kRegressionNormalsText[] =
    "The image which contain normal vectors. Used to construct a linear regression model of the output color.The "
    "parameter is optional, but if used can improve regression modeland reduce the output noise.";
inline constexpr char kRegressionDepthText[] =
    "The image which contain depth value. Used to construct a linear regression model of the output color.The "
    "parameter is optional, but if used can improve regression modeland reduce the output noise.";
inline constexpr char kBandwidthText[] =
    "Bandwidth of the filter. A smaller value provides lessnoise in the output image, but may result in loss of "
    "image detail";
inline constexpr char kWaveletNormalsText[] =
    "The image which contain normal vectors.Used to find the boundaries of the objects, that allows to avoid "
    "blurring of borders The parameter is optional, but if used can improve borders preservation.";
inline constexpr char kSobelText[] =
    "Sobel filter, is used in image processing and computer vision, particularly within edge detection "
    "algorithms where it creates an image emphasising edges.";
inline constexpr char kAntialiasingText[] =
    "The filter perform Morphological Antialiasing(MLAA) for input image.MLAA is an image-based, post-process "
    "filtering technique which identifies discontinuity patterns and blends colors in the neighborhood of these "
    "patterns to perform effective anti-aliasing.";
inline constexpr char kAntialiasingNormalsText[] =
    "The image which contain normal vectors in the -1..1 range.Used to find the boundaries of the objects. The "
    "parameter is optional, but if used can improve the finding of boundaries. Use normalTresholdparameter to "
    "adjust the sensitivity of the boundaries detector";
inline constexpr char kAntialiasingDepthText[] =
    "The image which contain depth value. Used to find the boundaries of the objects. The parameter is optional, "
    "but if used can improve the finding of boundaries. Use depthTresholdparameter to adjust the sensitivity of "
    "the boundaries detector";
inline constexpr char kColorThresholdText[] =
    "The color threshold of the detector of boundaries.The color difference differing by more than the threshold "
    "will be recognized as the boundary and subjected to smoothingGreater value corresponds to a large color "
    "difference needed to trigger.";
inline constexpr char kNormalThresholdText[] =
    "The normals threshold of the detector of boundaries.The scalar product of the normal vectors near the "
    "border is less than the threshold will be recognized as the boundary and subjected to smoothingSmallest "
    "value corresponds to a large normals difference needed to trigger.";
inline constexpr char kDepthThresholdText[] =
    "The depth threshold of the detector of boundaries.The depth difference differing by more than the threshold "
    "will be recognized as the boundary and subjected to smoothingGreater value corresponds to a large depth "
    "difference needed to trigger.";
inline constexpr char kAccumulationText[] =
    "Temporal accumulation of ray tracer results. Using a view projection matrix, the filter perform "
    "reprojection of the previously stored buffer for new camera position and addthis data to new frame. Note "
    "that the filter retains internal state";
inline constexpr char kPositionsText[] =
    "The image which contain position vectors.Used to generate motion map and for consistency testing.Parameter "
    "required for correct operation.";
inline constexpr char kAccumulationNormalsText[] =
    "The image which contain normal vectors. Used for consistency testing. The filter stores the value of the "
    "previous run to check if a geometry change has occurred.The parameter is optional, but if used can improve "
    "the consistency testing";
inline constexpr char kOutVarianceText[] =
    "The image in which output temporal variance will be stored.Variance is used by some filters to adjust the "
    "threshold for detection of boundaries. Optional parameter.";
inline constexpr char kViewProjectionText[] =
    "View projection matrix which was used when the current frame was rendered.Is used to reprojection "
    "previously obtained frame to new position and motion map generation.";
inline constexpr char kGaussianBlurText[] =
    "Gaussian blur (also known as Gaussian smoothing) is the result of blurring an image by a Gaussian function.";
inline constexpr char kTilingText[] = "Using local video memory can increase performance for large radii.";
inline constexpr char kLinearKeyText[] =
    "Linear coefficient by which the brightness of the image is multiplied. out = cKey * in";
inline constexpr char kRegressionText[] =
    "Local Weighted Regression filter. The filter builds a linear regression model of the dependence of color on "
    "the auxiliary parameters";
inline constexpr char kAntialiasingMeshText[] =
    "The image which contains IDs of the meshes.This parameter can be ignored.";
inline constexpr char kMeshIdsText[] =
    "The image which contains IDs of the meshes.The parameter is optional, but if used can improve the "
    "consistency testing";
