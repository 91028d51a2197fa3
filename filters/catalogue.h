// The filter types as data: one row per type, in type order.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "api/tov/types.h"

class TovImageFilter;

struct ParameterSpec {
    const char* name;
    uint32_t type;              // TOV_PARAMETER_TYPE_...
    const char* description;    // null: none
    float floatDefault = 0.0f;  // FLOAT1
    uint32_t uintDefault = 0;   // UINT1
};

enum class PassItemKind {
    Argument,       // the parameter; an image also defines its layout under the kernel argument's name
    ReadBack,       // likewise, of an output that a pass writes and a later one reads
    OwnParameters,  // every parameter of the filter, in order, as arguments
    Scratch,        // the context's scratch buffer
    State,          // the filter's state buffer
    Define,         // the parameter's value or layout under a name
    BuildOption,    // a flag
    ToXyz,          // matrix from the colour space that the parameter names
    FromXyz,        // matrix to it
    Ratio,          // size ratio of input to output, as a float2 argument
    RatioDefines,   // the same as whole numbers, as definitions
    GaussianCoefficients,
    ViewProjectionPair,
};

// Arguments, definitions and flags share one ordered list because their order is the contract with the kernel.
struct PassItem {
    PassItemKind kind;
    const char* name = nullptr;       // of the argument's parameter, the definition or the flag
    const char* parameter = nullptr;  // of a definition
};

struct PassSpec {
    const char* program;
    const char* kernel;
    bool grid2D = true;
    std::array<uint32_t, 2> localSize = {8, 8};
    std::vector<PassItem> items = {};
};

// What a value must be when the filter runs, so that no pixel divides by zero and no loop runs away.
struct ValueRule {
    enum Kind { NonZero, Positive, Range };
    const char* parameter;
    Kind kind;
    uint32_t least = 0;  // Range, both included
    uint32_t most = 0;
};

// How a run whose output is also an input must be treated.
enum class InPlace {
    PerPixel,     // each pixel is read before it is written, by the same item: safe in a buffer where the layouts agree
    PrivateCopy,  // reads more than its own pixel, or after its first write
};

// Which sizes the images may have, in pixels.
enum class SizeRule {
    CoverOutput,  // every input is at least as large as the output
    EqualInput,   // srcBuffer has exactly the output's size: kernels also index by it; the others cover the output
    EqualOutput,  // every input has exactly the output's size
    AnyInput,     // srcBuffer has any size, the others cover the output
    Unchecked,    // the filter's own check decides
};

struct FilterSpec {
    uint32_t type;
    const char* description = "";
    bool inPlaceAllowed = true;
    bool anySizeAllowed = false;
    uint32_t scratchBytesPerPixel = 0;  // of srcBuffer
    uint32_t stateBytesPerPixel = 0;    // of dstBuffer
    // Contents of a state buffer that is created with the filter; with null contents it starts as one zero byte.
    bool hasState = false;
    std::span<const uint8_t> (*stateContents)() = nullptr;
    InPlace inPlace = InPlace::PrivateCopy;
    SizeRule sizeRule = SizeRule::CoverOutput;
    bool readsOutputBack = false;  // see PassItemKind::ReadBack
    bool fusable = false;          // one pass without memory of its own, in a kernel that keeps to the form of fusion
    std::vector<const char*> required = {};  // image parameters that must be bound, besides input and output
    std::vector<const char*> outputs = {};   // image parameters that are written, besides dstBuffer
    std::vector<ParameterSpec> parameters = {};
    std::vector<ValueRule> rules = {};
    // Checks that a rule cannot express; refuses with a line.
    void (*check)(TovImageFilter&) = nullptr;
    std::vector<PassSpec> passes = {};
};

inline constexpr size_t kFilterTypes = 21;

// Throws invalid operation for an unknown type.
const FilterSpec& filterSpec(uint32_t type);

// Gives a new filter the parameters, the state buffer and the passes of its row.
void populate(TovImageFilter& filter);
