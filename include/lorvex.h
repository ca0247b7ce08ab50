/*
 * lorvex.h - image mapping operations for hosts that compose video pictures.
 *
 * Plain C interface, usable from C and C++. The library resamples a source
 * image into a destination image with selectable filters and composites it
 * at an opacity. It allocates nothing, starts no threads, reads no
 * configuration and keeps no state between calls. A call that cannot be
 * served does nothing: the destination is left exactly as it was.
 *
 * Conventions (pixel centres, units, rounding, chroma siting, fields and
 * alpha association) are described in docs/conventions.md.
 */
#ifndef LORVEX_H
#define LORVEX_H

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

#define LORVEX_VERSION_MAJOR 0
#define LORVEX_VERSION_MINOR 1
#define LORVEX_VERSION_PATCH 0

#if defined(LORVEX_BUILDING_LIBRARY) && defined(__GNUC__)
#define LORVEX_API __attribute__((visibility("default")))
#else
#define LORVEX_API
#endif

/* ------------------------------------------------------------------------
 * Images
 * ---------------------------------------------------------------------- */

/* Surface formats (the `format` byte). */
enum {
    FORMAT_ALPHA = 0,      /* no colour plane; the second plane is the image  */
    FORMAT_RGBQ = 1,       /* 4 bytes per pixel, all four treated alike       */
    FORMAT_YUY2 = 2,       /* 8-bit 4:2:2, bytes Y0 Cb Y1 Cr per pixel pair    */
    FORMAT_WORD = 3,       /* one 16-bit word per pixel (polygons only)        */
    FORMAT_YUVQ = 5,       /* bytes Cr Cb Y Q, Q is alpha (scroll sources)     */
    FORMAT_W210 = 6,       /* 10-bit 4:2:2 in 16-bit words Y0 Cb Y1 Cr         */
    FORMAT_WIDE_ALPHA = 10,/* four signed 16-bit words, word 3 alpha (polygons)*/
    FORMAT_WIDE = 11       /* four signed 16-bit words (polygons)              */
};

/* Second-plane kinds (the `alpha_format` field). */
enum {
    ALPHA_NONE = 0,        /* no second plane; alpha_data is not read          */
    ALPHA_W12B = 3         /* one u16 per pixel, 4096 = opaque, 0 = clear      */
};

/* Association of colour and alpha (the `alpha_mode` byte). A source counts
 * as straight only at 1; a destination counts as premultiplied only at 2. */
enum {
    ALPHA_MODE_STRAIGHT = 1,
    ALPHA_MODE_PREMULTIPLIED = 2
};

/* The image record. The host owns it and its pixels; the library only reads
 * the record and writes only the pixels of a destination. The layout is part
 * of the binary interface (little-endian, 64-bit pointers). */
typedef struct Surface {
    int32_t left;            /*  0: x of column 0 in a tile mosaic          */
    int32_t top;             /*  4: y of line 0 in a tile mosaic            */
    int32_t width;           /*  8: pixels                                  */
    int32_t height;          /* 12: lines of the whole frame                */
    uint8_t format;          /* 16: FORMAT_*                                */
    uint8_t alpha_mode;      /* 17: ALPHA_MODE_*                            */
    uint8_t reserved0[6];    /* 18                                          */
    void *data;              /* 24: line 0 of the first plane               */
    int32_t stride;          /* 32: bytes between lines, may be negative    */
    uint8_t reserved1[12];   /* 36                                          */
    int32_t alpha_format;    /* 48: ALPHA_NONE or ALPHA_W12B                */
    uint8_t reserved2[4];    /* 52                                          */
    void *alpha_data;        /* 56: line 0 of the second plane              */
    int32_t alpha_stride;    /* 64: bytes between lines of the second plane */
} Surface;

/* A polygon vertex: source position (u, v), weight w (reciprocal depth),
 * destination position (x, y). 20 bytes, no padding. */
typedef struct PolygonVertex {
    float u, v, w, x, y;
} PolygonVertex;

#ifdef __cplusplus
#define LORVEX_STATIC_ASSERT(c, m) static_assert(c, m)
#else
#define LORVEX_STATIC_ASSERT(c, m) _Static_assert(c, m)
#endif
LORVEX_STATIC_ASSERT(offsetof(Surface, left) == 0, "Surface.left");
LORVEX_STATIC_ASSERT(offsetof(Surface, top) == 4, "Surface.top");
LORVEX_STATIC_ASSERT(offsetof(Surface, width) == 8, "Surface.width");
LORVEX_STATIC_ASSERT(offsetof(Surface, height) == 12, "Surface.height");
LORVEX_STATIC_ASSERT(offsetof(Surface, format) == 16, "Surface.format");
LORVEX_STATIC_ASSERT(offsetof(Surface, alpha_mode) == 17, "Surface.alpha_mode");
LORVEX_STATIC_ASSERT(offsetof(Surface, data) == 24, "Surface.data");
LORVEX_STATIC_ASSERT(offsetof(Surface, stride) == 32, "Surface.stride");
LORVEX_STATIC_ASSERT(offsetof(Surface, alpha_format) == 48, "Surface.alpha_format");
LORVEX_STATIC_ASSERT(offsetof(Surface, alpha_data) == 56, "Surface.alpha_data");
LORVEX_STATIC_ASSERT(offsetof(Surface, alpha_stride) == 64, "Surface.alpha_stride");
LORVEX_STATIC_ASSERT(sizeof(PolygonVertex) == 20, "PolygonVertex size");

/* ------------------------------------------------------------------------
 * Operation flags (OpFlags) of the rectangle operations
 * ---------------------------------------------------------------------- */

#define LORVEX_SOURCE_EVEN_FIELD 0x00000004u /* read even source lines only */
#define LORVEX_SOURCE_ODD_FIELD  0x00000008u /* read odd source lines only; even wins */
#define LORVEX_TILE              0x00000010u /* partial edges add instead of mixing */
#define LORVEX_DEST_EVEN_FIELD   0x00000040u /* write even destination lines only */
#define LORVEX_DEST_ODD_FIELD    0x00000080u /* write odd destination lines only; even wins */
#define LORVEX_HFILTER_MASK      0x00000700u
#define LORVEX_VFILTER_MASK      0x00003800u
#define LORVEX_CHROMA_SOFTEN_MASK 0x0000C000u
#define LORVEX_LEVEL_MASK        0x1FFF0000u
#define LORVEX_VSOFTEN_MASK      0xE0000000u

/* Filter kinds for the horizontal and vertical filter fields. */
enum {
    LORVEX_FILTER_AREA = 0,     /* exact box average, no filter bank         */
    LORVEX_FILTER_LINEAR = 1,
    LORVEX_FILTER_CUBIC = 2,    /* Keys cubic, a = -1                        */
    LORVEX_FILTER_SOFT = 3,     /* squared sinc                              */
    LORVEX_FILTER_LANCZOS2 = 4,
    LORVEX_FILTER_LANCZOS3 = 5,
    LORVEX_FILTER_LANCZOS4 = 6, /* magnification only; area otherwise        */
    LORVEX_FILTER_EDGE = 7      /* magnification only: horizontally draws the
                                   edge regions alone; vertically an
                                   edge-adaptive interpolator (YUY2, RGBQ)   */
};

/* Polygon flags (PolygonFlags). Bits 2-4 mean what they mean in OpFlags. */
#define LORVEX_POLY_POINT_SAMPLE 0x01u
#define LORVEX_POLY_ANTIALIAS    0x02u

/* Opacity in 4096ths: 4096 is opaque, 0 draws nothing, up to 8188 is a gain.
 * The two lowest bits are dropped by the operations. */
static inline uint32_t lorvex_flag_level(int level4096)
{
    return (((uint32_t)level4096 + 4096u) & 0x1FFFu) << 16;
}

/* Opacity as a fraction from 0.0 to 2.0 (rounded to the nearest 4096th). */
static inline uint32_t lorvex_flag_opacity(double opacity)
{
    double v = opacity * 4096.0 + 0.5;
    int l = v < 0.0 ? 0 : v > 8188.0 ? 8188 : (int)v;
    return lorvex_flag_level(l);
}

static inline uint32_t lorvex_flag_hfilter(int kind)
{
    return ((uint32_t)kind & 7u) << 8;
}

static inline uint32_t lorvex_flag_vfilter(int kind)
{
    return ((uint32_t)kind & 7u) << 11;
}

/* Chroma filters widened by (8 + n) / 8, n from 0 to 3. */
static inline uint32_t lorvex_flag_chroma_soften(int n)
{
    return ((uint32_t)n & 3u) << 14;
}

/* Vertical filters widened by (8 + n) / 8, n from -4 (sharper) to 3. */
static inline uint32_t lorvex_flag_vsoften(int n)
{
    return ((uint32_t)n & 7u) << 29;
}

/* Both filter fields at once. */
static inline uint32_t lorvex_flag_filters(int hkind, int vkind)
{
    return lorvex_flag_hfilter(hkind) | lorvex_flag_vfilter(vkind);
}

/* Which operations this build of the library exports. The others are
 * declared below so that the interface reads whole, but linking against them
 * fails until a version that draws them. */
#define LORVEX_HAS_MAP_RECTANGLE 1
#define LORVEX_HAS_MULTISRC_MAP_RECTANGLE 1
#define LORVEX_HAS_ROLL_RECTANGLE 0
#define LORVEX_HAS_CRAWL_RECTANGLE 0
#define LORVEX_HAS_MAP_POLYGON 0

/* ------------------------------------------------------------------------
 * Operations
 *
 * Every operation draws exactly the destination lines L with
 * L % line_period == line_phase % line_period (taking the non-negative
 * residue); calls that differ only in line_phase write disjoint lines and
 * may run on different threads at once. line_period must be positive; a
 * call with line_period <= 0 draws nothing.
 * ---------------------------------------------------------------------- */

/* Resample source rectangle (sx0, sy0)-(sx1, sy1) into destination rectangle
 * (x0, y0)-(x1, y1), composited at the opacity of `flags`. Rectangles are in
 * frame pixels with fractional corners; partly covered edge pixels are drawn
 * at their exact coverage. The source continues beyond its edges by its edge
 * pixels. Pairings: YUY2 and W210 sources into YUY2 and W210 destinations,
 * RGBQ into RGBQ, ALPHA into ALPHA, each with the alpha-plane combinations
 * documented in docs/conventions.md; anything else is refused silently. */
LORVEX_API void map_rectangle(const Surface *dest, float x0, float y0, float x1, float y1,
                              const Surface *source, float sx0, float sy0, float sx1, float sy1,
                              int32_t flags, int32_t line_phase, int32_t line_period);

/* map_rectangle for a source held as tiles in one mosaic space (each tile at
 * its `left`, `top`). Each tile that overlaps the mapping is drawn through
 * map_rectangle in its own coordinates; with LORVEX_TILE set the partly
 * covered pixels at the seams add up. */
LORVEX_API void multisrc_map_rectangle(const Surface *dest, double x0, double y0, double x1,
                                       double y1, const Surface *const *tiles, int32_t tile_count,
                                       double sx0, double sy0, double sx1, double sy1,
                                       int32_t flags, int32_t line_phase, int32_t line_period);

/* One frame of a credits roll: a vertical stack of 1 to 4 sources at a
 * fractional line offset replaces the whole destination (colour and alpha). */
LORVEX_API void roll_rectangle(const Surface *dest, const Surface *const *sources,
                               int32_t source_count, double offset, int32_t flags,
                               int32_t line_phase, int32_t line_period);

/* One frame of a ticker crawl: a horizontal row of sources at a fractional
 * pixel offset replaces the whole destination (colour and alpha). */
LORVEX_API void crawl_rectangle(const Surface *dest, const Surface *const *sources,
                                int32_t source_count, double offset, int32_t flags,
                                int32_t line_phase, int32_t line_period);

/* A polygon of up to 30 vertices, perspective texture mapped from the source
 * and drawn with antialiased edges when LORVEX_POLY_ANTIALIAS is set. */
LORVEX_API void map_polygon(const Surface *dest, const Surface *source,
                            const PolygonVertex *vertices, int32_t vertex_count, uint32_t flags,
                            int32_t line_phase, int32_t line_period);

#ifdef __cplusplus
}
#endif

#endif /* LORVEX_H */
