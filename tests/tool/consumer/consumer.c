/* The smallest host: built against an installed library. */
#include <stdio.h>
#include <tov/tov.h>

int main(void) {
    uint32_t cpus = 0;
    const int32_t code = tovGetDeviceCount(TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, &cpus);
    printf("code %d, library %s\n", (int)code, TOV_VERSION_STRING);
    return code == TOV_SUCCESS && cpus > 0 ? 0 : 1;
}
