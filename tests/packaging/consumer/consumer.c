/* A program outside the lorvex project, built against the installed
 * package: it scales a two-colour YUY2 picture and checks the result. */
#include <lorvex.h>

#include <stdio.h>
#include <string.h>

int main(void)
{
    /* 4x2 source: the left pair Y 200, the right pair Y 100, chroma neutral. */
    uint8_t src[2][8], dst[4][16];
    for (int y = 0; y < 2; ++y) {
        const uint8_t line[8] = {200, 128, 200, 128, 100, 128, 100, 128};
        memcpy(src[y], line, sizeof line);
    }
    memset(dst, 0, sizeof dst);

    Surface s, d;
    memset(&s, 0, sizeof s);
    s.width = 4;
    s.height = 2;
    s.format = FORMAT_YUY2;
    s.data = src;
    s.stride = sizeof src[0];
    memset(&d, 0, sizeof d);
    d.width = 8;
    d.height = 4;
    d.format = FORMAT_YUY2;
    d.data = dst;
    d.stride = sizeof dst[0];

    /* Twice the size with the area kind, which repeats each pixel. */
    map_rectangle(&d, 0, 0, 8, 4, &s, 0, 0, 4, 2,
                  (int32_t)(lorvex_flag_filters(LORVEX_FILTER_AREA, LORVEX_FILTER_AREA) |
                            lorvex_flag_level(4096)),
                  0, 1);
    for (int y = 0; y < 4; ++y)
        for (int x = 0; x < 8; ++x)
            if (dst[y][2 * x] != (x < 4 ? 200 : 100) || dst[y][2 * x + 1] != 128) {
                fprintf(stderr, "consumer: pixel %d,%d is %d/%d\n", x, y, dst[y][2 * x], dst[y][2 * x + 1]);
                return 1;
            }
    printf("consumer: lorvex %d.%d.%d draws\n", LORVEX_VERSION_MAJOR, LORVEX_VERSION_MINOR,
           LORVEX_VERSION_PATCH);
    return 0;
}
