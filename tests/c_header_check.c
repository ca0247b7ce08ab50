/* The public header is plain C: this file compiles as C11 with -Wall -Wextra
 * -Werror and draws one picture through the shared library. */
#include <lorvex.h>
#include <string.h>

int main(void)
{
    unsigned char src[4 * 2 * 2], dst[4 * 2 * 2];
    Surface s, d;
    memset(&s, 0, sizeof s);
    memset(src, 200, sizeof src);
    memset(dst, 0, sizeof dst);
    s.width = 4;
    s.height = 2;
    s.format = FORMAT_YUY2;
    s.data = src;
    s.stride = 8;
    d = s;
    d.data = dst;
    map_rectangle(&d, 0, 0, 4, 2, &s, 0, 0, 4, 2,
                  (int32_t)(lorvex_flag_filters(LORVEX_FILTER_AREA, LORVEX_FILTER_AREA) |
                            lorvex_flag_level(4096)),
                  0, 1);
    return memcmp(src, dst, sizeof dst) == 0 ? 0 : 1;
}
