// map_rectangle end to end, on pictures whose every value is derivable: 1:1
// copies, constant colours at known coverages, depth conversions through the
// line buffer's unit, and one mapping drawn in pieces (clipped, by line phase,
// by field, from a source padded by hand) compared with the same mapping drawn
// whole. Destinations are compared byte for byte, stride padding and guard
// bytes included, so a write outside what the call may touch fails too.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <random>
#include <sstream>
#include <string>
#include <vector>

#include "lorvex.h"

namespace {

constexpr size_t kGuard = 64;

// An image inside a guarded allocation, addressed by element: pixel x of a
// 4:2:2 line has luma at element 2x and, for an even x, the pair's Cb at 2x + 1
// and Cr at 2x + 3; RGBQ pixel x has elements 4x to 4x + 3. 4:2:2 lines hold
// whole pairs. The guard after the image is eight lines long.
struct Image {
    uint8_t format;
    int w, h, epp, esize, elems, stride;
    std::vector<uint8_t> mem;
    Surface s{};

    Image(uint8_t fmt, int width, int height) : format(fmt), w(width), h(height) {
        epp = fmt == FORMAT_RGBQ ? 4 : 2;
        esize = fmt == FORMAT_W210 ? 2 : 1;
        elems = (fmt == FORMAT_RGBQ ? w : (w + 1) & ~1) * epp;
        stride = elems * esize + 16;
        mem.assign(kGuard + size_t(stride) * size_t(h + 8), 0xA5);
        s.width = w;
        s.height = h;
        s.format = fmt;
        s.stride = stride;
        s.data = mem.data() + kGuard;
    }
    Image(const Image&) = delete;

    size_t at(int e, int y) const { return kGuard + size_t(y) * size_t(stride) + size_t(e) * size_t(esize); }
    int get(int e, int y) const { return esize == 1 ? mem[at(e, y)] : mem[at(e, y)] | mem[at(e, y) + 1] << 8; }
    void set(int e, int y, int v) {
        mem[at(e, y)] = uint8_t(v);
        if (esize == 2) mem[at(e, y) + 1] = uint8_t(v >> 8);
    }
    // 0 luma (RGBQ sample 0), 1 Cb, 2 Cr (RGBQ samples 1 to 3 as 1 to 3).
    int kind(int e) const { return epp == 4 ? e % 4 : e % 2 == 0 ? 0 : e % 4 == 1 ? 1 : 2; }
    void fill(const int (&v)[4]) {
        for (int y = 0; y < h; ++y)
            for (int e = 0; e < elems; ++e) set(e, y, v[kind(e)]);
    }
    void fill_random(uint32_t seed) {
        std::mt19937 rng(seed);
        const int max = format == FORMAT_W210 ? 1023 : 255;
        for (int y = 0; y < h; ++y)
            for (int e = 0; e < elems; ++e) set(e, y, int(rng() % uint32_t(max + 1)));
    }
    void copy_from(const Image& o) { std::copy(o.mem.begin(), o.mem.end(), mem.begin()); }
};

// Calls fn(e) for every element that drawing pixel x writes.
template <class Fn>
void elements_of(const Image& i, int x, Fn fn) {
    if (i.epp == 4) {
        for (int k = 0; k < 4; ++k) fn(4 * x + k);
    } else {
        fn(2 * x);
        if (x % 2 == 0) {
            fn(2 * x + 1);
            fn(2 * x + 3);
        }
    }
}

// Draws into `want` what pixel x of line y shows when it shows source pixel
// sx of line sy: a 4:2:2 pair's chroma from the pair of sx.
void copy_pixel(Image& want, int x, int y, const Image& src, int sx, int sy) {
    elements_of(want, x, [&](int e) {
        const int k = e - want.epp * x;  // 0 luma, 1 Cb, 3 Cr; RGBQ 0 to 3
        want.set(e, y, src.get(want.epp == 4 ? 4 * sx + k : k == 0 ? 2 * sx : 2 * (sx & ~1) + k, sy));
    });
}

void paint(Image& i, int x0, int x1, int y0, int y1, const int (&v)[4]) {
    for (int y = y0; y < y1; ++y)
        for (int x = x0; x < x1; ++x) elements_of(i, x, [&](int e) { i.set(e, y, v[i.kind(e)]); });
}

::testing::AssertionResult same(const Image& want, const Image& got) {
    for (size_t i = 0; i < want.mem.size(); ++i) {
        if (want.mem[i] == got.mem[i]) continue;
        if (i < kGuard) return ::testing::AssertionFailure() << "guard byte " << i << " written";
        const size_t off = i - kGuard;
        const int y = int(off / size_t(want.stride)), e = int(off % size_t(want.stride)) / want.esize;
        if (y >= want.h || e >= want.elems)
            return ::testing::AssertionFailure() << "written outside the image, line " << y << " byte "
                                                 << off % size_t(want.stride);
        return ::testing::AssertionFailure() << "line " << y << " pixel " << e / want.epp << " sample " << e % want.epp
                                             << ": expected " << want.get(e, y) << ", got " << got.get(e, y);
    }
    return ::testing::AssertionSuccess();
}

struct Rect {
    float x0, y0, x1, y1;
};
Rect whole(const Image& i) { return {0, 0, float(i.w), float(i.h)}; }

void draw(Image& d, Rect r, const Image& s, Rect sr, uint32_t flags, int phase = 0, int period = 1) {
    map_rectangle(&d.s, r.x0, r.y0, r.x1, r.y1, &s.s, sr.x0, sr.y0, sr.x1, sr.y1, int32_t(flags), phase, period);
}

std::string what(uint8_t f, uint32_t flags) {
    std::ostringstream o;
    o << (f == FORMAT_YUY2 ? "YUY2" : f == FORMAT_W210 ? "W210" : "RGBQ") << " hfilter " << ((flags >> 8) & 7)
      << " vfilter " << ((flags >> 11) & 7) << " flags 0x" << std::hex << flags;
    return o.str();
}

constexpr uint8_t kFormats[] = {FORMAT_YUY2, FORMAT_W210, FORMAT_RGBQ};

// ---------------------------------------------------------------------------

TEST(MapRectangle, OneToOneCopiesWithEveryFilter) {
    for (uint8_t f : kFormats)
        for (int w : {37, 64}) {
            Image src(f, w, 12), dst(f, w, 12), want(f, w, 12);
            src.fill_random(uint32_t(w + f));
            for (int h = 0; h < 8; ++h)
                for (int v = 0; v < 8; ++v) {
                    // Vertical kind 7 exists for byte layouts only and copies
                    // only where the strip has no left padding (below).
                    if (v == 7 && (f == FORMAT_W210 || h == 2 || h == 4 || h == 5)) continue;
                    const uint32_t flags = lorvex_flag_filters(h, v);
                    dst.fill_random(99);
                    draw(dst, whole(dst), src, whole(src), flags);
                    want.fill_random(99);
                    for (int y = 0; y < want.h; ++y)
                        for (int x = 0; x < w; ++x) copy_pixel(want, x, y, src, x, y);
                    // The last pair of an odd width is a half: its chroma comes
                    // from what the kernels read past the last pixel.
                    for (int y = 0; want.epp == 2 && w % 2 && y < want.h; ++y)
                        for (int e : {2 * w - 1, 2 * w + 1}) want.set(e, y, dst.get(e, y));
                    ASSERT_TRUE(same(want, dst)) << what(f, flags) << " width " << w;
                }
        }
}

// Vertical kind 7 writes its line from buffer element 0 whatever the strip's
// left padding. With horizontal filters that pad two pixels on the left, the
// lines it serves (rows 3 to H - 5 at 1:1) come out two pixels to the left;
// the rows near the edges, served by the one-line and linear kernels, are
// copies. The last two pixels of a shifted line read past what it wrote.
TEST(MapRectangle, VerticalKindSevenIgnoresTheLeftPadding) {
    constexpr int W = 64, H = 14;
    for (uint8_t f : {FORMAT_YUY2, FORMAT_RGBQ})
        for (int h : {2, 4, 5}) {
            Image src(f, W, H), dst(f, W, H);
            src.fill_random(7);
            dst.fill_random(8);
            draw(dst, whole(dst), src, whole(src), lorvex_flag_filters(h, 7));
            for (int y = 0; y < H; ++y) {
                const int shift = y >= 3 && y <= H - 5 ? 2 * src.epp : 0;
                for (int e = 0; e < (W - 2) * src.epp; ++e)
                    ASSERT_EQ(dst.get(e, y), src.get(e + shift, y)) << what(f, lorvex_flag_filters(h, 7)) << " line "
                                                                    << y << " element " << e;
            }
        }
}

// The image continues by its edge pixels: a source rectangle reaching past
// the source draws what the same mapping draws from the source padded by hand
// with copies of its edge pixels (16 on each side, whole pairs). Steps are
// multiples of 1/16 so that both calls see the same positions exactly. The
// constant regions beyond the source truncate where the filters round, so
// each direction is tested with the other one exact: horizontally with whole
// lines at 1:1, vertically with a span at 1:1 inside the source.
TEST(MapRectangle, SourceContinuesByItsEdgePixels) {
    constexpr int W = 12, H = 9, P = 16;
    for (uint8_t f : kFormats) {
        Image src(f, W, H), padded(f, W + 2 * P, H + 2 * P);
        src.fill_random(3);
        for (int y = 0; y < padded.h; ++y)
            for (int x = 0; x < padded.w; ++x)
                copy_pixel(padded, x, y, src, std::clamp(x - P, 0, W - 1), std::clamp(y - P, 0, H - 1));
        const auto check = [&](Rect sr, int dw, int dh, uint32_t flags) {
            Image got(f, dw, dh), want(f, dw, dh);
            got.fill_random(4);
            want.fill_random(4);
            draw(got, whole(got), src, sr, flags);
            draw(want, whole(want), padded, {sr.x0 + P, sr.y0 + P, sr.x1 + P, sr.y1 + P}, flags);
            ASSERT_TRUE(same(want, got)) << what(f, flags) << " into " << dw << "x" << dh;
        };
        // 18 source pixels into 18, 32, 8 and 2; kind 7 magnifying draws the
        // constant regions alone.
        for (int dw : {18, 32, 8, 2})
            for (int h = 0; h < 8; ++h)
                if (h < 7 || dw <= 18) check({-3.25f, -3, W + 2.75f, H + 3}, dw, H + 6, lorvex_flag_filters(h, 1));
        // 15 source lines into 15 (half a line off), 24, 6 and 1.
        for (int dh : {15, 24, 6, 1})
            for (int h = 1; h <= 5; ++h)
                for (int v = 0; v < 7; ++v) check({0, -2.5f, W, H + 3.5f}, W, dh, lorvex_flag_filters(h, v));
    }
}

// A source range wholly left or right of the source: the first or the last
// source pixel of each line, one colour over the whole rectangle. On the area
// path the range ends exactly at the end of the first cell, or starts exactly
// at the start of the last one.
TEST(MapRectangle, SpanBeyondTheSourceTakesItsEdgeColour) {
    constexpr int H = 5;
    for (uint8_t f : kFormats)
        for (bool right : {false, true})
            for (int h : {0, 2}) {
                const int W = f == FORMAT_RGBQ ? 13 : 14;
                Image src(f, W, H), dst(f, 32, H), want(f, 32, H);
                src.fill_random(91);
                dst.fill_random(92);
                want.fill_random(92);
                const Rect sr = h == 0 ? (right ? Rect{W - 1.0f, 0, W + 27.0f, H} : Rect{-27, 0, 1, H})
                                       : (right ? Rect{W + 10.0f, 0, W + 50.0f, H} : Rect{-50, 0, -10, H});
                draw(dst, {2, 0, 30, H}, src, sr, lorvex_flag_filters(h, 1));
                for (int y = 0; y < H; ++y)
                    for (int x = 2; x < 30; ++x) copy_pixel(want, x, y, src, right ? W - 1 : 0, y);
                EXPECT_TRUE(same(want, dst)) << what(f, lorvex_flag_filters(h, 1)) << (right ? " right" : " left");
            }
}

// 8 and 10 bits meet in the buffer's unit: 8-bit v is 32v units and leaves
// as 4v in 10 bits; 1023 is 8184 units and would leave as 256 in 8 bits, so
// W210 into YUY2 is clamped, at every scale.
TEST(MapRectangle, EightAndTenBitConvertThroughTheBuffer) {
    const int w10[4] = {1023, 1023, 0, 0}, w10_as8[4] = {255, 255, 0, 0}, other[4] = {9, 9, 9, 0};
    for (uint32_t flags : {lorvex_flag_filters(0, 0), lorvex_flag_filters(1, 1), lorvex_flag_filters(2, 2)})
        for (const Rect dr : {Rect{0, 0, 16, 10}, Rect{1, 1, 15, 9}}) {
            Image src(FORMAT_W210, 16, 10), dst(FORMAT_YUY2, 16, 10), want(FORMAT_YUY2, 16, 10);
            src.fill(w10);
            dst.fill(other);
            want.fill(other);
            draw(dst, dr, src, whole(src), flags);
            paint(want, int(dr.x0), int(dr.x1), int(dr.y0), int(dr.y1), w10_as8);
            EXPECT_TRUE(same(want, dst)) << what(FORMAT_W210, flags) << " into YUY2";
        }

    // Every value at 1:1: 10 into 8 bits leaves as (v + 2) >> 2, limited to
    // 255, but the area path draws the first and last pixel as constant
    // regions, which truncate: v >> 2. 8 into 10 bits is 4v, ends included.
    constexpr int W = 16, H = 4;
    Image s10(FORMAT_W210, W, H), d8(FORMAT_YUY2, W, H), want8(FORMAT_YUY2, W, H);
    Image s8(FORMAT_YUY2, W, H), d10(FORMAT_W210, W, H), want10(FORMAT_W210, W, H);
    s10.fill_random(11);
    s8.fill_random(13);
    const int ends[] = {0, 1, 3, 2 * W - 2};  // pixel 0 with its pair's chroma, pixel W - 1
    for (int y = 0; y < H; ++y)
        for (int e : ends) s10.set(e, y, 502 + y % 2);  // rounding and truncation differ
    for (int h = 0; h < 8; ++h) {
        d8.fill_random(12);
        d10.fill_random(14);
        want10.fill_random(14);
        draw(d8, whole(d8), s10, whole(s10), lorvex_flag_filters(h, 1));
        draw(d10, whole(d10), s8, whole(s8), lorvex_flag_filters(h, 0));
        const bool area = h == 0 || h >= 6;  // 6 and 7 leave for the area path at 1:1
        for (int y = 0; y < H; ++y)
            for (int e = 0; e < 2 * W; ++e) {
                const int v = s10.get(e, y);
                const bool region = area && std::find(std::begin(ends), std::end(ends), e) != std::end(ends);
                want8.set(e, y, std::min(region ? v >> 2 : (v + 2) >> 2, 255));
                want10.set(e, y, 4 * s8.get(e, y));
            }
        EXPECT_TRUE(same(want8, d8)) << "W210 into YUY2, hfilter " << h;
        EXPECT_TRUE(same(want10, d10)) << "YUY2 into W210, hfilter " << h;
    }
}

// Constant source S over constant destination D: a pixel of horizontal
// coverage hc (16.16) on a line of vertical coverage vc (1/16384) becomes
// (D (16384 - c) + S c + 8192) >> 14, c = ((((hc vc + 32767) >> 16) L) + 2048)
// >> 12; a whole pixel follows the same formula at any level (c = 4L). A 4:2:2
// pair's chroma goes with its even pixel.
TEST(MapRectangle, PartlyCoveredPixelsAndLines) {
    constexpr int W = 8, H = 6;
    const Rect rects[] = {
        {0, 0.5f, 8, 2.5f},          // lines 0, 1, 2 at 8192, 16384, 8192
        {1.25f, 0, 4.75f, 6},        // an odd first pixel and an even last one at 0.75
        {0.5f, 0.25f, 7.5f, 5.75f},  // all four sides
        {2.25f, 1.25f, 2.5f, 1.75f}, // inside one pixel
        {-0.75f, 3.5f, 0.25f, 9},    // a fraction of a pixel left, reaching below
        {7.5f, -3, 12, 0.25f},       // a fraction right, reaching above
        {8, 0, 11, 6},    {-5, 0, -0.5f, 6}, {0, 6, 8, 7}, {0, -4, 8, -0.01f},  // wholly outside
        {3, 1, 3, 5},     {5, 1, 3, 5},      {1, 4, 5, 2},                      // empty or reversed
    };
    for (uint8_t f : kFormats)
        for (const Rect& r : rects)
            for (uint32_t flags : {0u, lorvex_flag_filters(2, 5), lorvex_flag_filters(1, 1) | lorvex_flag_level(2048)}) {
                const int level = (flags & LORVEX_LEVEL_MASK) ? 2048 : 4096;
                const int m = f == FORMAT_W210 ? 4 : 1;
                const int S[4] = {200 * m, 101 * m, 150 * m, 77}, D[4] = {40 * m, 60 * m, 90 * m, 13};
                Image src(f, W, H), dst(f, W, H), want(f, W, H);
                src.fill(S);
                dst.fill(D);
                want.fill(D);
                draw(dst, r, src, whole(src), flags);
                const int64_t X0 = int64_t(std::max(r.x0, 0.0f) * 65536.0f), X1 = int64_t(std::min(r.x1, 8.0f) * 65536.0f);
                const int64_t Y0 = int64_t(std::max(r.y0, 0.0f) * 16384.0f), Y1 = int64_t(std::min(r.y1, 6.0f) * 16384.0f);
                for (int y = 0; y < H && r.x1 > r.x0 && r.y1 > r.y0; ++y)
                    for (int x = 0; x < W; ++x) {
                        const int64_t hc = std::min(X1, int64_t(x + 1) << 16) - std::max(X0, int64_t(x) << 16);
                        const int64_t vc = std::min(Y1, int64_t(y + 1) << 14) - std::max(Y0, int64_t(y) << 14);
                        if (hc <= 0 || vc <= 0) continue;
                        const int c = int(((((hc * vc + 32767) >> 16) * level) + 2048) >> 12);
                        elements_of(want, x, [&](int e) {
                            want.set(e, y, (D[want.kind(e)] * (16384 - c) + S[want.kind(e)] * c + 8192) >> 14);
                        });
                    }
                EXPECT_TRUE(same(want, dst)) << what(f, flags) << " rectangle (" << r.x0 << ", " << r.y0 << ")-("
                                             << r.x1 << ", " << r.y1 << ")";
            }
}

// A rectangle cut by the destination's left and top edges samples the same
// source positions in the pixels that remain: compare with the mapping drawn
// whole 14 pixels right and 6 lines down in a larger destination. Steps of
// 1/2 and 2 keep every position exact in binary, on both paths.
TEST(MapRectangle, ClippingKeepsTheMapping) {
    constexpr int W = 32, H = 24, DX = 14, DY = 6;
    const int filters[][2] = {{0, 0}, {1, 1}, {2, 2}, {3, 3}, {4, 4}, {5, 5}, {6, 6}, {2, 0}, {0, 5}};
    for (uint8_t f : {FORMAT_YUY2, FORMAT_RGBQ}) {
        Image src(f, 112, 80);
        src.fill_random(21);
        for (float step : {0.5f, 2.0f})
            for (const auto& hv : filters) {
                const uint32_t flags = lorvex_flag_filters(hv[0], hv[1]);
                const Rect sr{0.5f, 0.25f, 0.5f + 54 * step, 0.25f + 36 * step};
                Image small(f, W, H), big(f, 80, 48);
                small.fill_random(1);
                big.fill_random(2);
                draw(small, {-13.25f, -5.5f, 40.75f, 30.5f}, src, sr, flags);
                draw(big, {0.75f, 0.5f, 54.75f, 36.5f}, src, sr, flags);
                for (int y = 0; y < H; ++y)
                    for (int e = 0; e < W * small.epp; ++e)
                        ASSERT_EQ(small.get(e, y), big.get(e + DX * small.epp, y + DY))
                            << what(f, flags) << " step " << step << " line " << y << " element " << e;
            }
    }
}

// Lines L with L congruent to line_phase modulo line_period, each as if all
// were drawn; a negative or large phase counts by its residue; a period of 0
// or below draws nothing.
TEST(MapRectangle, LinePhaseAndPeriodSplitTheLines) {
    constexpr int W = 40, H = 30;
    Image src(FORMAT_YUY2, 23, 17);
    src.fill_random(31);
    const Rect dr{0.5f, 2.5f, 37.5f, 28.75f};
    struct Split {
        int period;
        std::vector<int> phases;
    };
    const Split splits[] = {{2, {0, 1}}, {3, {0, 1, 2}}, {4, {5, -1, 2, -4}}, {4, {1001, -5, 6, 0}}};
    for (uint32_t flags : {lorvex_flag_filters(2, 2), 0u, lorvex_flag_filters(1, 1), lorvex_flag_filters(5, 5) | LORVEX_TILE}) {
        Image full(FORMAT_YUY2, W, H), part(FORMAT_YUY2, W, H), want(FORMAT_YUY2, W, H), joined(FORMAT_YUY2, W, H);
        full.fill_random(32);
        draw(full, dr, src, whole(src), flags);
        for (const Split& sp : splits) {
            joined.fill_random(32);
            for (int phase : sp.phases) {
                part.fill_random(32);
                draw(part, dr, src, whole(src), flags, phase, sp.period);
                draw(joined, dr, src, whole(src), flags, phase, sp.period);
                want.fill_random(32);
                for (int y = ((phase % sp.period) + sp.period) % sp.period; y < H; y += sp.period)
                    for (int e = 0; e < want.elems; ++e) want.set(e, y, full.get(e, y));
                ASSERT_TRUE(same(want, part)) << what(FORMAT_YUY2, flags) << " phase " << phase << " period " << sp.period;
            }
            ASSERT_TRUE(same(full, joined)) << what(FORMAT_YUY2, flags) << " period " << sp.period;
        }
        for (int period : {0, -1, -4}) {
            part.fill_random(32);
            want.fill_random(32);
            draw(part, dr, src, whole(src), flags, 0, period);
            ASSERT_TRUE(same(want, part)) << "period " << period;
        }
    }
}

// A destination field writes only its lines. From a progressive source at the
// frame's scale, field line i stands at frame line 2i (even) or 2i + 1 (odd);
// the position moves by a quarter of a field line's step so that it samples
// exactly that frame line, which linear interpolation sharpened to stay
// linear at a reduction of 2 copies. A rectangle reaching below the frame
// stops at the field's last line. Both field bits: the even field.
TEST(MapRectangle, DestinationFieldsWriteTheirLinesAtTheirPlace) {
    constexpr int W = 24;
    const struct {
        int H;
        float below;
    } frames[] = {{16, 0}, {16, 6}, {15, 6}};
    for (const auto [H, below] : frames)
        for (uint32_t field : {LORVEX_DEST_EVEN_FIELD, LORVEX_DEST_ODD_FIELD, LORVEX_DEST_EVEN_FIELD | LORVEX_DEST_ODD_FIELD}) {
            Image src(FORMAT_YUY2, W, H), dst(FORMAT_YUY2, W, H), want(FORMAT_YUY2, W, H);
            src.fill_random(41);
            const uint32_t flags = field | lorvex_flag_filters(1, 1) | lorvex_flag_vsoften(-4);
            {
                dst.fill_random(42);
                want.fill_random(42);
                draw(dst, {0, 0, W, H + below}, src, {0, 0, W, H + below}, flags);
                for (int y = field == LORVEX_DEST_ODD_FIELD ? 1 : 0; y < H; y += 2)
                    for (int e = 0; e < want.elems; ++e) want.set(e, y, src.get(e, y));
                EXPECT_TRUE(same(want, dst)) << what(FORMAT_YUY2, flags) << " height " << H << " reaching " << below
                                             << " below";
            }
        }
}

// An interlaced frame drawn field by field, each destination field from the
// source field of its parity, is the frame.
TEST(MapRectangle, FrameDrawnAsTwoFieldsIsTheFrame) {
    for (uint8_t f : {FORMAT_YUY2, FORMAT_RGBQ}) {
        Image src(f, 20, 18), dst(f, 20, 18), want(f, 20, 18);
        src.fill_random(51);
        want.copy_from(src);
        for (int v = 0; v < 8; ++v)
            for (int h : {0, 1, 2}) {
                if (v == 7 && h == 2) continue;  // see VerticalKindSevenIgnoresTheLeftPadding
                const uint32_t flags = lorvex_flag_filters(h, v);
                dst.fill_random(52);
                draw(dst, whole(dst), src, whole(src), flags | LORVEX_DEST_EVEN_FIELD | LORVEX_SOURCE_EVEN_FIELD);
                draw(dst, whole(dst), src, whole(src), flags | LORVEX_DEST_ODD_FIELD | LORVEX_SOURCE_ODD_FIELD);
                ASSERT_TRUE(same(want, dst)) << what(f, flags);
            }
    }
}

// A source field reads only its lines: with distinct constants in the even
// and odd source lines every filter draws the field's constant. Both bits:
// the even field.
TEST(MapRectangle, SourceFieldsReadOnlyTheirLines) {
    constexpr int W = 12, H = 10;
    Image src(FORMAT_YUY2, W, H), dst(FORMAT_YUY2, W, H), want(FORMAT_YUY2, W, H);
    for (int y = 0; y < H; ++y)
        for (int e = 0; e < src.elems; ++e) src.set(e, y, y % 2 ? 201 - e % 2 * 50 : 35 + e % 2 * 70);
    for (uint32_t field : {LORVEX_SOURCE_EVEN_FIELD, LORVEX_SOURCE_ODD_FIELD, LORVEX_SOURCE_EVEN_FIELD | LORVEX_SOURCE_ODD_FIELD})
        for (int v = 0; v < 7; ++v) {
            const uint32_t flags = field | lorvex_flag_filters(2, v);
            dst.fill_random(61);
            draw(dst, whole(dst), src, whole(src), flags);
            for (int y = 0; y < H; ++y)
                for (int e = 0; e < want.elems; ++e) want.set(e, y, src.get(e, field == LORVEX_SOURCE_ODD_FIELD));
            ASSERT_TRUE(same(want, dst)) << what(FORMAT_YUY2, flags);
        }
}

// Kind 6 applies only to magnification, but the boundary differs by axis: it
// stays in force vertically at a step of exactly 1 and leaves for the area
// path above it; horizontally it leaves at 1. Half a pixel off a step edge
// from 16 to 200, Lanczos rings past the two levels, area does not.
TEST(MapRectangle, KindSixLeavesForAreaAtOneHorizontallyAboveOneVertically) {
    constexpr int N = 16;
    for (bool vertical : {true, false})
        for (float extra : {0.0f, 0.1f, -0.1f}) {
            Image src(FORMAT_YUY2, N, N), dst(FORMAT_YUY2, N, N);
            for (int y = 0; y < N; ++y)
                for (int x = 0; x < N; ++x) elements_of(src, x, [&](int e) { src.set(e, y, (vertical ? y : x) < N / 2 ? 16 : 200); });
            const Rect sr = vertical ? Rect{0, 0.5f, N, N + 0.5f + extra} : Rect{0.5f, 0, N + 0.5f + extra, N};
            draw(dst, whole(dst), src, sr, lorvex_flag_filters(vertical ? 1 : 6, vertical ? 6 : 1));
            bool rings = false;
            for (int y = 0; y < N; ++y)
                for (int x = 0; x < N; ++x) rings |= dst.get(2 * x, y) < 16 || dst.get(2 * x, y) > 200;
            const bool lanczos = vertical ? extra <= 0 : extra < 0;
            EXPECT_EQ(rings, lanczos) << (vertical ? "vertical" : "horizontal") << " step 1 + " << extra / N;
        }
}

TEST(MapRectangle, RefusedCallsLeaveTheDestinationAlone) {
    const Rect one{0, 0, 8, 6}, part{1, 1, 5, 4};  // destination 8 x 6; `part` magnifies
    const struct {
        const char* name;
        uint8_t sf;
        int sa;  // alpha_format
        uint8_t df;
        int da;
        uint32_t flags;
        Rect dr, sr;
    } cases[] = {
        {"RGBQ into YUY2", FORMAT_RGBQ, 0, FORMAT_YUY2, 0, 0, one, one},
        {"YUY2 into RGBQ", FORMAT_YUY2, 0, FORMAT_RGBQ, 0, 0, one, one},
        {"W210 into RGBQ", FORMAT_W210, 0, FORMAT_RGBQ, 0, 0, one, one},
        {"RGBQ into W210", FORMAT_RGBQ, 0, FORMAT_W210, 0, 0, one, one},
        {"word", FORMAT_WORD, 0, FORMAT_WORD, 0, 0, one, one},
        {"YUY2 into word", FORMAT_YUY2, 0, FORMAT_WORD, 0, 0, one, one},
        {"YUVQ source", FORMAT_YUVQ, 0, FORMAT_YUY2, 0, 0, one, one},
        {"wide destination", FORMAT_RGBQ, 0, FORMAT_WIDE, 0, 0, one, one},
        {"unknown code", 4, 0, FORMAT_YUY2, 0, 0, one, one},
        {"alpha without its plane", FORMAT_ALPHA, 0, FORMAT_ALPHA, 0, 0, one, one},
        {"source alpha_format 1", FORMAT_YUY2, 1, FORMAT_YUY2, 0, 0, one, one},
        {"source alpha_format 2", FORMAT_YUY2, 2, FORMAT_YUY2, 0, 0, one, one},
        {"destination alpha_format 1", FORMAT_YUY2, 0, FORMAT_YUY2, 1, 0, one, one},
        {"destination alpha_format 2", FORMAT_RGBQ, 0, FORMAT_RGBQ, 2, 0, one, one},
        {"hfilter 7 into W210", FORMAT_YUY2, 0, FORMAT_W210, 0, lorvex_flag_hfilter(7), one, part},
        {"hfilter 7 W210 into W210", FORMAT_W210, 0, FORMAT_W210, 0, lorvex_flag_hfilter(7), one, part},
        {"vfilter 7 from W210", FORMAT_W210, 0, FORMAT_W210, 0, lorvex_flag_vfilter(7), one, one},
        {"vfilter 7 from W210 into YUY2", FORMAT_W210, 0, FORMAT_YUY2, 0, lorvex_flag_filters(1, 7), one, part},
        {"level 0", FORMAT_YUY2, 0, FORMAT_YUY2, 0, 0x10000000u, one, one},
        {"reversed", FORMAT_YUY2, 0, FORMAT_YUY2, 0, 0, {6, 0, 2, 6}, one},
        {"empty", FORMAT_RGBQ, 0, FORMAT_RGBQ, 0, 0, {2, 3, 6, 3}, one},
    };
    for (const auto& c : cases) {
        const auto layout = [](uint8_t fmt) { return fmt == FORMAT_YUY2 || fmt == FORMAT_W210 ? fmt : uint8_t(FORMAT_RGBQ); };
        Image src(layout(c.sf), 8, 6), dst(layout(c.df), 8, 6), want(layout(c.df), 8, 6);
        src.fill_random(71);
        dst.fill_random(72);
        want.fill_random(72);
        std::vector<uint16_t> salpha(8 * 6, 2048), dalpha(8 * 6, 1000);
        const std::vector<uint16_t> dalpha_before = dalpha;
        src.s.format = c.sf;
        src.s.alpha_format = c.sa;
        src.s.alpha_data = salpha.data();
        src.s.alpha_stride = 16;
        dst.s.format = c.df;
        dst.s.alpha_format = c.da;
        dst.s.alpha_data = dalpha.data();
        dst.s.alpha_stride = 16;
        draw(dst, c.dr, src, c.sr, c.flags);
        EXPECT_TRUE(same(want, dst)) << c.name;
        EXPECT_EQ(dalpha, dalpha_before) << c.name;
    }
}

// Horizontal kind 7 magnifying: its main kernel draws nothing, the constant
// regions are drawn. Source [-12, 28) of 8 pixels at twice the size: pixel i
// stands at -12.25 + i / 2 (bias included), and with the filter's reach of 6
// pixels left and 8 right, pixels 0 to 12 lie left of the source, 55 to 79
// right of it.
TEST(MapRectangle, HorizontalKindSevenDrawsOnlyTheConstantRegions) {
    constexpr int W = 8, H = 5, DW = 80;
    Image src(FORMAT_YUY2, W, H), dst(FORMAT_YUY2, DW, H), want(FORMAT_YUY2, DW, H);
    src.fill_random(81);
    dst.fill_random(82);
    want.fill_random(82);
    draw(dst, whole(dst), src, {-12, 0, 28, H}, lorvex_flag_filters(7, 1));
    for (int y = 0; y < H; ++y)
        for (int x = 0; x < DW; ++x)
            if (x <= 12 || x >= 55) copy_pixel(want, x, y, src, x <= 12 ? 0 : W - 1, y);
    EXPECT_TRUE(same(want, dst));
}

// Every filter reproduces a constant, magnifying, reducing and beyond a
// reduction of 8, in every layout; and so do full frames.
TEST(MapRectangle, EveryFilterKeepsAConstant) {
    const int C[3][4] = {{81, 90, 240, 0}, {700, 3, 1020, 0}, {0, 255, 77, 128}}, other[4] = {1, 2, 3, 4};
    struct Size {
        int w, h;
    };
    for (int fi = 0; fi < 3; ++fi) {
        const uint8_t f = kFormats[fi];
        Image src(f, 20, 16);
        src.fill(C[fi]);
        for (const Size size : {Size{33, 27}, Size{12, 9}, Size{2, 2}})
            for (int h = 0; h < 8; ++h)
                for (int v = 0; v < 8; ++v) {
                    // Kind 7 magnifying: vertically only the byte layouts have
                    // it; horizontally its main kernel draws nothing.
                    if (size.w > 20 && ((v == 7 && f == FORMAT_W210) || h == 7)) continue;
                    Image dst(f, size.w, size.h), want(f, size.w, size.h);
                    dst.fill(other);
                    want.fill(other);
                    paint(want, 0, size.w, 0, size.h, C[fi]);
                    draw(dst, whole(dst), src, whole(src), lorvex_flag_filters(h, v));
                    ASSERT_TRUE(same(want, dst)) << what(f, lorvex_flag_filters(h, v)) << " into " << size.w << "x"
                                                 << size.h;
                }
    }

    Image hd(FORMAT_YUY2, 1920, 1080), sd(FORMAT_YUY2, 1280, 720);
    Image want_hd(FORMAT_YUY2, 1920, 1080), want_sd(FORMAT_YUY2, 1280, 720);
    hd.fill(C[0]);
    sd.fill(other);
    want_sd.fill(C[0]);
    draw(sd, whole(sd), hd, whole(hd), lorvex_flag_filters(2, 2));
    EXPECT_TRUE(same(want_sd, sd)) << "1920x1080 into 1280x720";
    const int black[4] = {16, 128, 128, 0};
    sd.fill(black);
    want_hd.fill(black);
    draw(hd, whole(hd), sd, whole(sd), lorvex_flag_filters(2, 2));
    EXPECT_TRUE(same(want_hd, hd)) << "1280x720 into 1920x1080";
}

}  // namespace
