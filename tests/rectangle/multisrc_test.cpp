// multisrc_map_rectangle: a source held as tiles, each at its `left` and
// `top` in one mosaic space. Each tile's share of the mapping is one
// map_rectangle call in the tile's own coordinates, so the tests compare
// with map_rectangle on single Surfaces: a seam inside a destination pixel
// adds up in tile mode, tiles outside the source rectangle and empty tile
// arrays draw nothing, the tiles' positions are honoured, and a mosaic of one
// colour comes out as that colour with no seam. Destinations are compared
// byte for byte, guard bytes and stride padding included.
#include <gtest/gtest.h>

#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "lorvex.h"

namespace {

constexpr size_t kGuard = 64;

// An image with an optional alpha plane, each plane inside guard bytes. A
// 4:2:2 pixel x has luma at element 2x and its pair's Cb and Cr at
// 2(x & ~1) + 1 and + 3; RGBQ pixel x has elements 4x .. 4x + 3.
struct Image {
    int w, h, epp, elems, stride, astride = 0;
    std::vector<uint8_t> mem, amem;
    Surface s{};

    Image(uint8_t fmt, int width, int height, int left = 0, int top = 0, bool alpha = false,
          uint8_t mode = ALPHA_MODE_STRAIGHT)
        : w(width), h(height)
    {
        epp = fmt == FORMAT_RGBQ ? 4 : 2;
        elems = (epp == 2 ? (w + 1) & ~1 : w) * epp;
        stride = elems + 4;
        mem.assign(2 * kGuard + size_t(stride) * size_t(h), 0xA5);
        s.left = left;
        s.top = top;
        s.width = w;
        s.height = h;
        s.format = fmt;
        s.alpha_mode = mode;
        s.data = mem.data() + kGuard;
        s.stride = stride;
        if (alpha) {
            astride = 2 * w;
            amem.assign(2 * kGuard + size_t(astride) * size_t(h), 0x5A);
            s.alpha_format = ALPHA_W12B;
            s.alpha_data = amem.data() + kGuard;
            s.alpha_stride = astride;
        }
    }
    Image(const Image&) = delete;
    Image& operator=(const Image&) = delete;

    int get(int e, int y) const { return mem[kGuard + size_t(y) * size_t(stride) + size_t(e)]; }
    void set(int e, int y, int v) { mem[kGuard + size_t(y) * size_t(stride) + size_t(e)] = uint8_t(v); }
    int kind(int e) const { return epp == 4 ? e % 4 : e % 2 == 0 ? 0 : e % 4 == 1 ? 1 : 2; }
    void fill(const int (&v)[4])
    {
        for (int y = 0; y < h; ++y)
            for (int e = 0; e < elems; ++e) set(e, y, v[kind(e)]);
    }
    void fill_random(uint32_t seed)
    {
        std::mt19937 rng(seed);
        for (int y = 0; y < h; ++y)
            for (int e = 0; e < elems; ++e) set(e, y, int(rng() % 256));
    }
    void fill_alpha(int a)
    {
        for (int y = 0; y < h; ++y)
            for (int x = 0; x < w; ++x) {
                amem[kGuard + size_t(y) * size_t(astride) + 2 * size_t(x)] = uint8_t(a);
                amem[kGuard + size_t(y) * size_t(astride) + 2 * size_t(x) + 1] = uint8_t(a >> 8);
            }
    }
    void copy_from(const Image& o)
    {
        mem = o.mem;
        amem = o.amem;
    }
};

::testing::AssertionResult same(const Image& want, const Image& got)
{
    for (size_t i = 0; i < want.mem.size(); ++i) {
        if (want.mem[i] == got.mem[i]) continue;
        if (i < kGuard || i >= want.mem.size() - kGuard)
            return ::testing::AssertionFailure() << "guard byte " << i << " written";
        const size_t o = i - kGuard;
        const int y = int(o / size_t(want.stride)), e = int(o % size_t(want.stride));
        if (e >= want.elems) return ::testing::AssertionFailure() << "padding of line " << y << " written";
        return ::testing::AssertionFailure() << "line " << y << " element " << e << " (pixel " << e / want.epp
                                             << "): expected " << want.get(e, y) << ", got " << got.get(e, y);
    }
    return ::testing::AssertionSuccess();
}

struct Rect {
    double x0, y0, x1, y1;
};

void multi(Image& d, Rect r, const std::vector<const Surface*>& tiles, Rect sr, uint32_t flags)
{
    multisrc_map_rectangle(&d.s, r.x0, r.y0, r.x1, r.y1, tiles.data(), int32_t(tiles.size()), sr.x0, sr.y0, sr.x1,
                           sr.y1, int32_t(flags), 0, 1);
}

void single(Image& d, Rect r, const Image& s, Rect sr, uint32_t flags)
{
    map_rectangle(&d.s, float(r.x0), float(r.y0), float(r.x1), float(r.y1), &s.s, float(sr.x0), float(sr.y0),
                  float(sr.x1), float(sr.y1), int32_t(flags), 0, 1);
}

const int kBlack[4] = {16, 128, 128, 0};
const int kRgbqBlack[4] = {0, 0, 0, 0};
// (S - o) of every sample is a multiple of 4, so halves and quarters of it
// are exact.
const int kColour[4] = {200, 100, 180, 0};
const int kRgbqColour[4] = {200, 100, 180, 60};

// Two 4x2 tiles side by side (left 0 and 4) of one colour, mapped 1:1 half a
// pixel to the right: the seam falls in the middle of destination pixel 4,
// which each tile covers by half. In tile mode, on black, the halves add up:
//   luma 16 + ((184 8192 + 8192) >> 14) = 16 + 92, then + 92 = 200;
//   Cb 128 + ((-28 8192 + 8192) >> 14) = 128 - 14, then - 14 = 100;
// so the picture is that of one 8x2 Surface of the colour. In overlay the
// second half mixes over the first: (108 8192 + 200 8192 + 8192) >> 14 = 154.
TEST(Multisrc, SeamInsideAPixelAddsUpInTileMode)
{
    Image a(FORMAT_YUY2, 4, 2, 0, 0), b(FORMAT_YUY2, 4, 2, 4, 0), whole_src(FORMAT_YUY2, 8, 2);
    a.fill(kColour);
    b.fill(kColour);
    whole_src.fill(kColour);
    const std::vector<const Surface*> tiles = {&a.s, &b.s};
    const Rect dr{0.5, 0, 8.5, 2}, sr{0, 0, 8, 2};

    Image got(FORMAT_YUY2, 10, 2), want(FORMAT_YUY2, 10, 2);
    got.fill(kBlack);
    want.fill(kBlack);
    multi(got, dr, tiles, sr, LORVEX_TILE);
    single(want, dr, whole_src, sr, LORVEX_TILE);
    EXPECT_TRUE(same(want, got));
    for (int y = 0; y < 2; ++y) {
        EXPECT_EQ(got.get(8, y), 200) << "luma of the seam pixel, line " << y;
        EXPECT_EQ(got.get(9, y), 100) << "Cb of the seam pixel's pair, line " << y;
        EXPECT_EQ(got.get(11, y), 180) << "Cr of the seam pixel's pair, line " << y;
    }

    Image over(FORMAT_YUY2, 10, 2);
    over.fill(kBlack);
    multi(over, dr, tiles, sr, 0);
    EXPECT_EQ(over.get(8, 0), 154);
}

// A tile that lies wholly outside the source rectangle adds nothing, even
// where the destination rectangle would have room for it: the picture is the
// one the tile inside draws alone.
TEST(Multisrc, TileOutsideTheSourceRectangleDrawsNothing)
{
    Image inside(FORMAT_YUY2, 4, 2, 0, 0), right(FORMAT_YUY2, 4, 2, 4, 0), below(FORMAT_YUY2, 4, 2, 0, 2);
    inside.fill_random(1);
    const int other[4] = {235, 16, 240, 0};
    right.fill(other);
    below.fill(other);
    for (uint32_t flags : {0u, uint32_t(LORVEX_TILE), lorvex_flag_filters(2, 2)}) {
        Image got(FORMAT_YUY2, 8, 4), want(FORMAT_YUY2, 8, 4);
        got.fill_random(2);
        want.copy_from(got);
        multi(got, {0, 0, 4, 2}, {&right.s, &inside.s, &below.s}, {0, 0, 4, 2}, flags);
        single(want, {0, 0, 4, 2}, inside, {0, 0, 4, 2}, flags);
        EXPECT_TRUE(same(want, got)) << "flags 0x" << std::hex << flags;
    }
}

// With no tiles the operation returns before it reads the array.
TEST(Multisrc, NoTilesDrawNothing)
{
    for (int32_t count : {0, -1, -100}) {
        Image got(FORMAT_YUY2, 6, 2), want(FORMAT_YUY2, 6, 2);
        got.fill_random(3);
        want.copy_from(got);
        multisrc_map_rectangle(&got.s, 0, 0, 6, 2, nullptr, count, 0, 0, 6, 2, 0, 0, 1);
        EXPECT_TRUE(same(want, got)) << "tile_count " << count;
    }
}

// A tile's `left` and `top` place it in the mosaic: the part of the mosaic at
// (5, 3) is that tile's pixel (0, 0). map_rectangle ignores both fields.
TEST(Multisrc, TilesStandAtTheirLeftAndTop)
{
    for (uint8_t fmt : {FORMAT_YUY2, FORMAT_RGBQ}) {
        constexpr int W = 6, H = 4;
        Image tile(fmt, W, H, 5, 3), at_origin(fmt, W, H, 0, 0);
        tile.fill_random(4);
        at_origin.copy_from(tile);
        struct Case {
            Rect dst, src_mosaic, src_tile;
            uint32_t flags;
        };
        const Case cases[] = {
            {{1, 1, 1 + W, 1 + H}, {5, 3, 5 + W, 3 + H}, {0, 0, W, H}, 0},
            {{1, 1, 1 + 2 * W, 1 + 2 * H}, {5, 3, 5 + W, 3 + H}, {0, 0, W, H}, lorvex_flag_filters(1, 1)},
            {{0.5, 0.25, 8.5, 6.25}, {6, 4, 10, 6}, {1, 1, 5, 3}, lorvex_flag_filters(2, 2)},
        };
        for (const Case& k : cases) {
            Image got(fmt, 14, 10), want(fmt, 14, 10), direct(fmt, 14, 10);
            got.fill_random(5);
            want.copy_from(got);
            direct.copy_from(got);
            multi(got, k.dst, {&tile.s}, k.src_mosaic, k.flags);
            single(want, k.dst, at_origin, k.src_tile, k.flags);
            single(direct, k.dst, tile, k.src_tile, k.flags);
            EXPECT_TRUE(same(want, got)) << "multisrc, flags 0x" << std::hex << k.flags;
            EXPECT_TRUE(same(want, direct)) << "map_rectangle with left and top set, flags 0x" << std::hex << k.flags;
        }
    }
}

// A destination rectangle that reaches beyond the destination is cut before
// the tile's call, keeping the mapping: one tile at the origin then draws
// what map_rectangle draws with the same rectangles.
TEST(Multisrc, CutToTheDestinationKeepsTheMapping)
{
    Image tile(FORMAT_YUY2, 8, 4), got(FORMAT_YUY2, 5, 2), want(FORMAT_YUY2, 5, 2);
    tile.fill_random(6);
    got.fill_random(7);
    want.copy_from(got);
    multi(got, {-2, -1, 6, 3}, {&tile.s}, {0, 0, 8, 4}, lorvex_flag_filters(1, 1));
    single(want, {-2, -1, 6, 3}, tile, {0, 0, 8, 4}, lorvex_flag_filters(1, 1));
    EXPECT_TRUE(same(want, got));

    // The cut uses the frame's height also when a field is drawn; the field's
    // own clipping is map_rectangle's.
    for (uint32_t field : {uint32_t(LORVEX_DEST_EVEN_FIELD), uint32_t(LORVEX_DEST_ODD_FIELD)}) {
        Image fgot(FORMAT_YUY2, 8, 8), fwant(FORMAT_YUY2, 8, 8);
        fgot.fill_random(8);
        fwant.copy_from(fgot);
        multi(fgot, {0, 1, 8, 8}, {&tile.s}, {0, 0, 8, 4}, lorvex_flag_filters(1, 1) | field);
        single(fwant, {0, 1, 8, 8}, tile, {0, 0, 8, 4}, lorvex_flag_filters(1, 1) | field);
        EXPECT_TRUE(same(fwant, fgot)) << "field 0x" << std::hex << field;
    }
}

// A 2x2 mosaic of 10x6 tiles of one colour reduced 4:1 into 5x3 destination
// pixels: the vertical seam falls in the middle of pixel 2 (an even pixel,
// so its pair's chroma comes in two halves too), the horizontal one in the
// middle of line 1, so pixel (2, 1) takes four quarters. In tile mode over
// black every pixel of the rectangle comes out as the colour, with no seam;
// pixel 5 lies outside and stays black. Whether the tiles carry an alpha
// plane of 4096, straight or premultiplied, changes nothing. (The tiles are
// of even width: a 4:2:2 line of odd width ends in half a pair, and the
// padding beyond it takes its chroma from the elements around the last
// pixel as they stand.)
TEST(Multisrc, MosaicOfOneColourHasNoSeams)
{
    for (uint8_t fmt : {FORMAT_YUY2, FORMAT_RGBQ})
        for (int alpha = 0; alpha < 3; ++alpha) {
            SCOPED_TRACE(std::string(fmt == FORMAT_RGBQ ? "RGBQ" : "YUY2") +
                         (alpha == 0 ? "" : alpha == 1 ? ", straight alpha" : ", premultiplied alpha"));
            const int(&colour)[4] = fmt == FORMAT_RGBQ ? kRgbqColour : kColour;
            const int(&black)[4] = fmt == FORMAT_RGBQ ? kRgbqBlack : kBlack;
            const uint8_t mode = alpha == 1 ? ALPHA_MODE_STRAIGHT : ALPHA_MODE_PREMULTIPLIED;
            Image t00(fmt, 10, 6, 0, 0, alpha != 0, mode), t10(fmt, 10, 6, 10, 0, alpha != 0, mode),
                t01(fmt, 10, 6, 0, 6, alpha != 0, mode), t11(fmt, 10, 6, 10, 6, alpha != 0, mode);
            for (Image* t : {&t00, &t10, &t01, &t11}) {
                t->fill(colour);
                if (alpha) t->fill_alpha(4096);
            }
            Image got(fmt, 6, 3), want(fmt, 6, 3);
            got.fill(black);
            want.fill(colour);
            for (int y = 0; y < 3; ++y)
                for (int e = 5 * want.epp; e < want.elems; ++e)
                    if (fmt == FORMAT_RGBQ || want.kind(e) == 0) want.set(e, y, black[want.kind(e)]);
            multi(got, {0, 0, 5, 3}, {&t00.s, &t10.s, &t01.s, &t11.s}, {0, 0, 20, 12}, LORVEX_TILE);
            EXPECT_TRUE(same(want, got));
        }
}

// Alpha-only tiles add up too: in tile mode a partly covered pixel adds
// e = (c12 A + 2048) >> 12 to the word, a whole one takes A. Four 10x6 tiles
// of 4096 reduced 4:1: halves of 2048 at the seams and quarters of 1024 at
// the corner, c12 = ((0x8000 8192 + 0x1ffff) >> 18) = 1024, give 4096
// everywhere.
TEST(Multisrc, AlphaOnlyMosaicAddsUpToOpaque)
{
    struct AlphaTile {
        std::vector<uint16_t> words;
        Surface s{};
        AlphaTile(int w, int h, int left, int top, int value) : words(size_t(w * h), uint16_t(value))
        {
            s.left = left;
            s.top = top;
            s.width = w;
            s.height = h;
            s.format = FORMAT_ALPHA;
            s.alpha_format = ALPHA_W12B;
            s.alpha_data = words.data();
            s.alpha_stride = 2 * w;
        }
    };
    AlphaTile t00(10, 6, 0, 0, 4096), t10(10, 6, 10, 0, 4096), t01(10, 6, 0, 6, 4096), t11(10, 6, 10, 6, 4096);
    AlphaTile dst(6, 3, 0, 0, 0);
    const std::vector<const Surface*> tiles = {&t00.s, &t10.s, &t01.s, &t11.s};
    multisrc_map_rectangle(&dst.s, 0, 0, 5, 3, tiles.data(), 4, 0, 0, 20, 12, LORVEX_TILE, 0, 1);
    for (int y = 0; y < 3; ++y)
        for (int x = 0; x < 6; ++x)
            EXPECT_EQ(dst.words[size_t(y * 6 + x)], x < 5 ? 4096 : 0) << "pixel " << x << ", line " << y;
}

}  // namespace
