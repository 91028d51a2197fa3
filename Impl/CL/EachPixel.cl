// The kernels below compute every pixel by itself: on central processors they take many of them in a loop, which
// GET_COORD begins and WritePixel ends.
#if ON_CENTRAL_PROCESSOR
#undef GET_COORD
#define GET_COORD(coord, limits) TAKE_PIXELS_OF_GROUP(coord, limits)
#undef WritePixel
#define WritePixel(buffer, x, y, rgba) PUT_PIXEL_OF_GROUP(buffer, x, y, rgba)
#endif
