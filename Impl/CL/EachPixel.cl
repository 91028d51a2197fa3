// The kernels below compute every pixel by itself: on central processors they are loops, as in fused programs.
#if ON_CENTRAL_PROCESSOR
DEFINE_ALL_PIXEL_ACCESS(SINGLY, ReadSingly, WriteSingly)
#define ReadSingly_none_none ReadPixel_none_none
#define ReadSingly_sampler_ ReadPixel_sampler_
#define WriteSingly_none_none WritePixel_none_none
#define WriteSingly_sampler_ WritePixel_sampler_

#undef ReadPixel__
#define ReadPixel__(type, count, buffer, bufferSize, x, y) ReadSingly_##type##_##count(buffer, bufferSize, x, y)
#undef PutPixel__
#define PutPixel__(type, count, buffer, bufferSize, x, y, rgba) \
    WriteSingly_##type##_##count(buffer, bufferSize, x, y, rgba)
#undef GET_COORD
#define GET_COORD(coord, limits) TAKE_PIXELS_OF_GROUP(coord, limits)
#undef WritePixel
#define WritePixel(buffer, x, y, rgba) PUT_PIXEL_OF_GROUP(buffer, x, y, rgba)
#endif
