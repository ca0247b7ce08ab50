/*
 * lorvex-example [OUTDIR]
 *
 * Draws a 640x360 test card in FORMAT_RGBQ, scales it with map_rectangle to
 * 1280x720 and to 320x180 with four filter kinds, and once more through
 * FORMAT_YUY2 with the cubic filter. Every result is written as an 8-bit RGB
 * PNG into OUTDIR (default "out"), which is created if needed.
 *
 * The card holds what shows a scaler's character: colour bars (hard colour
 * edges, chroma), a zone plate and diagonal lines (aliasing and ringing), a
 * grey ramp (banding) and a few lines of small text (sharpness).
 */
#define _XOPEN_SOURCE 700 /* realpath */

#include <lorvex.h>
#include <png.h>

#include <errno.h>
#include <math.h>
#include <stdarg.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <sys/types.h>

#define PROGRAM "lorvex-example"
#define CARD_WIDTH 640
#define CARD_HEIGHT 360
#define PI 3.14159265358979323846

/* ------------------------------------------------------------------------
 * Images
 * ---------------------------------------------------------------------- */

#if defined(__GNUC__)
__attribute__((format(printf, 1, 2)))
#endif
static _Noreturn void fail(const char *fmt, ...)
{
    va_list args;
    va_start(args, fmt);
    fputs(PROGRAM ": ", stderr);
    vfprintf(stderr, fmt, args);
    fputc('\n', stderr);
    va_end(args);
    exit(1);
}

static void *checked_calloc(size_t count, size_t size)
{
    void *p = calloc(count, size);
    if (p == NULL)
        fail("out of memory");
    return p;
}

/* A surface of one plane without alpha: the record is zeroed first, so that
 * alpha_format is ALPHA_NONE and every reserved byte is 0. The pixels start
 * as zero bytes. */
static Surface new_surface(int width, int height, int format)
{
    int bytes_per_pixel = format == FORMAT_RGBQ ? 4 : 2;
    Surface s;
    memset(&s, 0, sizeof s);
    s.width = width;
    s.height = height;
    s.format = (uint8_t)format;
    s.stride = width * bytes_per_pixel;
    s.data = checked_calloc((size_t)height, (size_t)s.stride);
    return s;
}

static uint8_t *pixel(const Surface *s, int x, int y)
{
    int bytes_per_pixel = s->format == FORMAT_RGBQ ? 4 : 2;
    return (uint8_t *)s->data + (ptrdiff_t)y * s->stride + x * bytes_per_pixel;
}

static void put_rgb(Surface *card, int x, int y, int r, int g, int b)
{
    uint8_t *p = pixel(card, x, y);
    p[0] = (uint8_t)r;
    p[1] = (uint8_t)g;
    p[2] = (uint8_t)b;
    p[3] = 255;
}

/* ------------------------------------------------------------------------
 * The test card
 * ---------------------------------------------------------------------- */

/* 5x7 glyphs, one byte per row, bit 4 the leftmost column. */
static const struct glyph {
    char c;
    uint8_t rows[7];
} glyphs[] = {
    {'0', {0x0E, 0x11, 0x13, 0x15, 0x19, 0x11, 0x0E}},
    {'1', {0x04, 0x0C, 0x04, 0x04, 0x04, 0x04, 0x0E}},
    {'2', {0x0E, 0x11, 0x01, 0x02, 0x04, 0x08, 0x1F}},
    {'3', {0x1F, 0x02, 0x04, 0x02, 0x01, 0x11, 0x0E}},
    {'4', {0x02, 0x06, 0x0A, 0x12, 0x1F, 0x02, 0x02}},
    {'5', {0x1F, 0x10, 0x1E, 0x01, 0x01, 0x11, 0x0E}},
    {'6', {0x06, 0x08, 0x10, 0x1E, 0x11, 0x11, 0x0E}},
    {'7', {0x1F, 0x01, 0x02, 0x04, 0x08, 0x08, 0x08}},
    {'8', {0x0E, 0x11, 0x11, 0x0E, 0x11, 0x11, 0x0E}},
    {'9', {0x0E, 0x11, 0x11, 0x0F, 0x01, 0x02, 0x0C}},
    {'A', {0x0E, 0x11, 0x11, 0x1F, 0x11, 0x11, 0x11}},
    {'C', {0x0E, 0x11, 0x10, 0x10, 0x10, 0x11, 0x0E}},
    {'D', {0x1C, 0x12, 0x11, 0x11, 0x11, 0x12, 0x1C}},
    {'E', {0x1F, 0x10, 0x10, 0x1E, 0x10, 0x10, 0x1F}},
    {'L', {0x10, 0x10, 0x10, 0x10, 0x10, 0x10, 0x1F}},
    {'O', {0x0E, 0x11, 0x11, 0x11, 0x11, 0x11, 0x0E}},
    {'R', {0x1E, 0x11, 0x11, 0x1E, 0x14, 0x12, 0x11}},
    {'S', {0x0F, 0x10, 0x10, 0x0E, 0x01, 0x01, 0x1E}},
    {'T', {0x1F, 0x04, 0x04, 0x04, 0x04, 0x04, 0x04}},
    {'V', {0x11, 0x11, 0x11, 0x11, 0x11, 0x0A, 0x04}},
    {'X', {0x11, 0x11, 0x0A, 0x04, 0x0A, 0x11, 0x11}},
};

/* Text in white, each glyph cell `scale` pixels square, one blank column
 * between glyphs. Characters without a glyph are drawn as spaces. */
static void draw_text(Surface *card, int x, int y, int scale, const char *text)
{
    for (; *text != '\0'; ++text, x += 6 * scale) {
        const uint8_t *rows = NULL;
        for (size_t i = 0; i < sizeof glyphs / sizeof glyphs[0]; ++i)
            if (glyphs[i].c == *text)
                rows = glyphs[i].rows;
        if (rows == NULL)
            continue;
        for (int gy = 0; gy < 7 * scale; ++gy)
            for (int gx = 0; gx < 5 * scale; ++gx)
                if (rows[gy / scale] & (0x10 >> (gx / scale)))
                    put_rgb(card, x + gx, y + gy, 235, 235, 235);
    }
}

static Surface make_card(void)
{
    /* 75% colour bars: white, yellow, cyan, green, magenta, red, blue, black. */
    static const uint8_t bars[8][3] = {
        {191, 191, 191}, {191, 191, 0}, {0, 191, 191}, {0, 191, 0},
        {191, 0, 191},   {191, 0, 0},   {0, 0, 191},   {0, 0, 0},
    };
    Surface card = new_surface(CARD_WIDTH, CARD_HEIGHT, FORMAT_RGBQ);

    for (int y = 0; y < 144; ++y)
        for (int x = 0; x < CARD_WIDTH; ++x) {
            const uint8_t *c = bars[x / 80];
            put_rgb(&card, x, y, c[0], c[1], c[2]);
        }

    /* Zone plate, 240x120: cos(pi r^2 / R) has the local frequency r / R
     * cycles per pixel, so with R twice the corner distance it reaches the
     * Nyquist limit just at the corners. */
    const double cx = 119.5, cy = 59.5;
    const double rr = 2.0 * sqrt(cx * cx + cy * cy);
    for (int y = 0; y < 120; ++y)
        for (int x = 0; x < 240; ++x) {
            double dx = x - cx, dy = y - cy;
            int v = (int)lround(128.0 + 127.0 * cos(PI * (dx * dx + dy * dy) / rr));
            put_rgb(&card, x, 144 + y, v, v, v);
        }

    /* Four panels of one-pixel diagonal lines, periods 3, 4, 6 and 8,
     * leaning alternately right and left. */
    static const int periods[4] = {3, 4, 6, 8};
    for (int panel = 0; panel < 4; ++panel)
        for (int y = 0; y < 120; ++y)
            for (int x = 0; x < 100; ++x) {
                int t = panel % 2 == 0 ? x + y : x + 120 - y;
                int v = t % periods[panel] == 0 ? 235 : 16;
                put_rgb(&card, 240 + panel * 100 + x, 144 + y, v, v, v);
            }

    /* Grey ramp from 0 to 255 across the width. */
    for (int y = 264; y < 304; ++y)
        for (int x = 0; x < CARD_WIDTH; ++x) {
            int v = (x * 255 + (CARD_WIDTH - 1) / 2) / (CARD_WIDTH - 1);
            put_rgb(&card, x, y, v, v, v);
        }

    /* Text on dark grey. */
    for (int y = 304; y < CARD_HEIGHT; ++y)
        for (int x = 0; x < CARD_WIDTH; ++x)
            put_rgb(&card, x, y, 40, 40, 40);
    draw_text(&card, 8, 308, 2, "LORVEX TEST CARD 640X360");
    draw_text(&card, 8, 328, 1, "0123456789 ACDELORSTVX 9876543210 XVTSROLEDCA");
    draw_text(&card, 8, 340, 1, "TEST CARD 640X360 LORVEX 0123456789");

    /* A one-pixel white border marks the edges of the picture. */
    for (int x = 0; x < CARD_WIDTH; ++x) {
        put_rgb(&card, x, 0, 235, 235, 235);
        put_rgb(&card, x, CARD_HEIGHT - 1, 235, 235, 235);
    }
    for (int y = 0; y < CARD_HEIGHT; ++y) {
        put_rgb(&card, 0, y, 235, 235, 235);
        put_rgb(&card, CARD_WIDTH - 1, y, 235, 235, 235);
    }
    return card;
}

/* ------------------------------------------------------------------------
 * BT.601 video-range conversion between RGB and YUY2
 * ---------------------------------------------------------------------- */

static int clamp255(int v)
{
    return v < 0 ? 0 : v > 255 ? 255 : v;
}

/* (v + 128) / 256 rounded down, for v down to -2^18: the bias keeps the
 * division on non-negative numbers. */
static int descale8(int v)
{
    return (v + 128 + (1 << 18)) / 256 - (1 << 10);
}

/* Chroma is co-sited with the even pixel of each pair, so the pair takes
 * the even pixel's Cb and Cr; the odd pixel contributes its luma only. */
static Surface rgbq_to_yuy2(const Surface *rgbq)
{
    Surface yuy2 = new_surface(rgbq->width, rgbq->height, FORMAT_YUY2);
    for (int y = 0; y < rgbq->height; ++y)
        for (int x = 0; x < rgbq->width; ++x) {
            const uint8_t *p = pixel(rgbq, x, y);
            int r = p[0], g = p[1], b = p[2];
            uint8_t *q = pixel(&yuy2, x, y);
            q[0] = (uint8_t)(16 + descale8(66 * r + 129 * g + 25 * b));
            if (x % 2 == 0) {
                q[1] = (uint8_t)(128 + descale8(-38 * r - 74 * g + 112 * b));
                q[3] = (uint8_t)(128 + descale8(112 * r - 94 * g - 18 * b));
            }
        }
    return yuy2;
}

/* Into packed RGB rows for the PNG writer. */
static uint8_t *yuy2_to_rgb(const Surface *yuy2)
{
    uint8_t *rgb = checked_calloc((size_t)yuy2->width * (size_t)yuy2->height, 3);
    for (int y = 0; y < yuy2->height; ++y)
        for (int x = 0; x < yuy2->width; ++x) {
            const uint8_t *pair = pixel(yuy2, x & ~1, y);
            int c = 298 * (pixel(yuy2, x, y)[0] - 16);
            int d = pair[1] - 128, e = pair[3] - 128;
            uint8_t *out = rgb + ((size_t)y * (size_t)yuy2->width + (size_t)x) * 3;
            out[0] = (uint8_t)clamp255(descale8(c + 409 * e));
            out[1] = (uint8_t)clamp255(descale8(c - 100 * d - 208 * e));
            out[2] = (uint8_t)clamp255(descale8(c + 516 * d));
        }
    return rgb;
}

static uint8_t *rgbq_to_rgb(const Surface *rgbq)
{
    uint8_t *rgb = checked_calloc((size_t)rgbq->width * (size_t)rgbq->height, 3);
    for (int y = 0; y < rgbq->height; ++y)
        for (int x = 0; x < rgbq->width; ++x)
            memcpy(rgb + ((size_t)y * (size_t)rgbq->width + (size_t)x) * 3, pixel(rgbq, x, y), 3);
    return rgb;
}

/* ------------------------------------------------------------------------
 * Scaling
 * ---------------------------------------------------------------------- */

struct filter {
    int kind;
    const char *name;
};

static const struct filter filters[] = {
    {LORVEX_FILTER_AREA, "area"},
    {LORVEX_FILTER_LINEAR, "linear"},
    {LORVEX_FILTER_CUBIC, "cubic"},
    {LORVEX_FILTER_LANCZOS3, "lanczos3"},
};

/* The whole source into the whole destination, opaque, on this thread
 * alone (line_phase 0, line_period 1). map_rectangle refuses what it cannot
 * serve by leaving the destination alone; the destination starts as zero
 * bytes, so a result that is still all zeros was refused. */
static void scale(Surface *dest, const Surface *source, const struct filter *f)
{
    int32_t flags = (int32_t)(lorvex_flag_filters(f->kind, f->kind) | lorvex_flag_level(4096));
    map_rectangle(dest, 0.0f, 0.0f, (float)dest->width, (float)dest->height,
                  source, 0.0f, 0.0f, (float)source->width, (float)source->height,
                  flags, 0, 1);

    const uint8_t *bytes = dest->data;
    size_t size = (size_t)dest->height * (size_t)dest->stride;
    for (size_t i = 0; i < size; ++i)
        if (bytes[i] != 0)
            return;
    fail("map_rectangle drew nothing with the %s filter: this build of the library "
         "does not serve the call", f->name);
}

/* ------------------------------------------------------------------------
 * Output
 * ---------------------------------------------------------------------- */

static char *join_path(const char *dir, const char *name)
{
    char *path = checked_calloc(strlen(dir) + strlen(name) + 2, 1);
    snprintf(path, strlen(dir) + strlen(name) + 2, "%s/%s", dir, name);
    return path;
}

/* mkdir -p: every missing component of the path is created. */
static void make_directories(const char *dir)
{
    char *path = checked_calloc(strlen(dir) + 1, 1);
    strcpy(path, dir);
    for (char *p = path + 1; ; ++p) {
        if (*p != '/' && *p != '\0')
            continue;
        char end = *p;
        *p = '\0';
        if (mkdir(path, 0777) != 0 && errno != EEXIST)
            fail("cannot create directory '%s': %s", path, strerror(errno));
        *p = end;
        if (end == '\0')
            break;
    }
    struct stat st;
    if (stat(dir, &st) != 0 || !S_ISDIR(st.st_mode))
        fail("'%s' is not a directory", dir);
    free(path);
}

/* Packed 8-bit RGB rows into a PNG file; prints the file's path. */
static void write_png(const char *dir, const char *name, int width, int height, uint8_t *rgb)
{
    char *path = join_path(dir, name);
    png_image image;
    memset(&image, 0, sizeof image);
    image.version = PNG_IMAGE_VERSION;
    image.width = (png_uint_32)width;
    image.height = (png_uint_32)height;
    image.format = PNG_FORMAT_RGB;
    if (!png_image_write_to_file(&image, path, 0, rgb, width * 3, NULL))
        fail("cannot write '%s': %s", path, image.message);
    png_image_free(&image);
    printf("  %s\n", path);
    free(path);
    free(rgb);
}

int main(int argc, char **argv)
{
    if (argc > 2 || (argc == 2 && (strcmp(argv[1], "-h") == 0 || strcmp(argv[1], "--help") == 0))) {
        fprintf(argc > 2 ? stderr : stdout, "usage: " PROGRAM " [OUTDIR]\n");
        return argc > 2 ? 1 : 0;
    }
    const char *outdir = argc == 2 ? argv[1] : "out";
    if (outdir[0] == '\0')
        fail("the output directory name is empty");

    make_directories(outdir);
    char *dir = realpath(outdir, NULL);
    if (dir == NULL)
        fail("cannot resolve '%s': %s", outdir, strerror(errno));
    printf("Writing pictures to %s\n", dir);

    char name[64];
    Surface card = make_card();
    snprintf(name, sizeof name, "card-%dx%d.png", card.width, card.height);
    write_png(dir, name, card.width, card.height, rgbq_to_rgb(&card));

    static const int sizes[2][2] = {{1280, 720}, {320, 180}};
    for (int s = 0; s < 2; ++s)
        for (size_t f = 0; f < sizeof filters / sizeof filters[0]; ++f) {
            Surface dest = new_surface(sizes[s][0], sizes[s][1], FORMAT_RGBQ);
            scale(&dest, &card, &filters[f]);
            snprintf(name, sizeof name, "rgbq-%dx%d-%s.png", dest.width, dest.height,
                     filters[f].name);
            write_png(dir, name, dest.width, dest.height, rgbq_to_rgb(&dest));
            free(dest.data);
        }

    /* The same card as 8-bit 4:2:2 video, scaled with the cubic filter. */
    Surface card_yuy2 = rgbq_to_yuy2(&card);
    Surface dest = new_surface(1280, 720, FORMAT_YUY2);
    scale(&dest, &card_yuy2, &filters[2]);
    snprintf(name, sizeof name, "yuy2-%dx%d-%s.png", dest.width, dest.height, filters[2].name);
    write_png(dir, name, dest.width, dest.height, yuy2_to_rgb(&dest));

    free(dest.data);
    free(card_yuy2.data);
    free(card.data);
    free(dir);
    return 0;
}
