// Local weighted regression: the pixels of a window, and which of them take part.

#define IMAGE_PARAMETERS                                                                                     \
    srcBufferType(srcBuffer), srcBufferType(vColorBuff), srcBufferType(transBuff), srcBufferType(vTransBuff), \
        srcBufferType(normalsBuff), srcBufferType(vNormalsBuff), srcBufferType(depthBuff), srcBufferType(vDepthBuff)
#define IMAGES srcBuffer, vColorBuff, transBuff, vTransBuff, normalsBuff, vNormalsBuff, depthBuff, vDepthBuff

// What the windows of one work item share: pixels low to high, and the scales of the inputs, which are sums of samples.
typedef struct {
    int2 centre;
    int2 low;
    int2 high;
    float half_window;
    float per_sample;    // 1 / samples
    float per_variance;  // 1 / (samples - 1)
    int usable;          // Which features of the centre are usable, as in Sample.
} Window;

// One pixel, scaled to means; zeros in place of unusable features.
typedef struct {
    float8 features;  // Steps from the centre across and down, depth, normal, red and green of the transition colour.
    float last;       // Its blue.
    float3 color;
    float variance;  // Mean of the three channels' variances, of the mean.
    int usable;      // Bits: 1 normal, 2 depth, 4 transition.
    bool color_usable;
} Sample;

// Walks the pixels (x, y) of a window, row after row.
#define FOR_EACH_PIXEL(window, x, y)                            \
    for (int y = (window)->low.y; y <= (window)->high.y; ++y) \
        for (int x = (window)->low.x; x <= (window)->high.x; ++x)

static inline Window WindowAt(int2 centre, int2 size, int half_window, uint samples) {
    Window window;
    window.centre = centre;
    window.low = max(centre - half_window, (int2)(0));
    window.high = min(centre + half_window, size - 1);
    window.half_window = (float)half_window;
    window.per_sample = 1.0f / (float)samples;
    window.per_variance = 1.0f / (float)(samples - 1);
    window.usable = 0;
    return window;
}

static inline float Mean3(float3 value) {
    return (value.x + value.y + value.z) * (1.0f / 3.0f);
}

static inline float3 UsableOrZero(float4 value) {
    return IsUsable(value) ? value.xyz : (float3)(0.0f);
}

static inline bool AllUsable(float4 a, float4 b, float4 c, float4 d) {
    const uint4 ab = max(as_uint4(a) & 0x7fffffffu, as_uint4(b) & 0x7fffffffu);
    const uint4 cd = max(as_uint4(c) & 0x7fffffffu, as_uint4(d) & 0x7fffffffu);
    return IsUsable(as_float4(max(ab, cd)));
}

// The features beside a colour.
static inline Sample ReadFeatures(IMAGE_PARAMETERS, const Window* window, int x, int y, float4 color) {
    float4 transition = IS_ABSENT(transBuff) ? (float4)(0.0f) : ReadPixel(transBuff, x, y);
    float4 normal = IS_ABSENT(normalsBuff) ? (float4)(0.0f) : ReadPixel(normalsBuff, x, y);
    float4 depth = IS_ABSENT(depthBuff) ? (float4)(0.0f) : (float4)(ReadPixel(depthBuff, x, y).y);
    Sample sample;
    sample.usable = 7;
    sample.color_usable = true;
    if (!AllUsable(transition, normal, depth, color)) {
        sample.usable = (IsUsable(normal) ? 1 : 0) + (IsUsable(depth) ? 2 : 0) + (IsUsable(transition) ? 4 : 0);
        sample.color_usable = IsUsable(color);
        transition.xyz = UsableOrZero(transition);
        normal.xyz = UsableOrZero(normal);
        depth.x = UsableOrZero(depth).x;
    }
    const float3 t = transition.xyz * window->per_sample;
    sample.features = (float8)((float)(x - window->centre.x), (float)(y - window->centre.y),
                               depth.x * window->per_sample, normal.xyz * window->per_sample, t.x, t.y);
    sample.last = t.z;
    return sample;
}

static inline Sample ReadSample(IMAGE_PARAMETERS, const Window* window, int x, int y) {
    const float4 color = ReadPixel(srcBuffer, x, y);
    const float4 variance = IS_ABSENT(vColorBuff) ? (float4)(0.0f) : ReadPixel(vColorBuff, x, y);
    Sample sample = ReadFeatures(IMAGES, window, x, y, color);
    sample.color = UsableOrZero(color) * window->per_sample;
    sample.variance = fmax(Mean3(UsableOrZero(variance)), 0.0f) * window->per_sample * window->per_variance;
    return sample;
}

static inline bool TakesPart(const Window* window, const Sample* sample) {
    return sample->color_usable && sample->usable == window->usable;
}

// Whether a pixel's mean is too far from the centre's for the noise of the two.
static inline bool IsOutlier(const Sample* centre, const Sample* sample) {
    const float limit = 3.0f * (sqrt(centre->variance) + sqrt(sample->variance)) + 0.005f;
    return centre->color_usable && fabs(Mean3(sample->color) - Mean3(centre->color)) > limit;
}

// Mean colour of the pixels that take part.
static inline float3 MeanColor(IMAGE_PARAMETERS, const Window* window) {
    float3 sum = (float3)(0.0f);
    float num = 0.0f;
    FOR_EACH_PIXEL(window, x, y) {
        const Sample sample = ReadSample(IMAGES, window, x, y);
        if (TakesPart(window, &sample)) {
            sum += sample.color;
            num += 1.0f;
        }
    }
    return sum / fmax(num, 1.0f);
}
