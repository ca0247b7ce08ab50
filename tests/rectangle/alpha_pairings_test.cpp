// map_rectangle with alpha planes, end to end: which pairings of source and
// destination draw and which are refused, what each pairing does to a
// constant picture (the vertical table of the source, the horizontal family
// of the destination, the clamp of the row), the asymmetric reading of
// alpha_mode, and where a source with straight colour and its premultiplied
// twin must give the same picture. The straight vertical tables, which
// premultiply on the way into the line buffer, are tested here too, by their
// kernels.
//
// Every destination (colour plane, alpha plane, stride padding and guard
// bytes around each plane) is compared byte for byte.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <random>
#include <sstream>
#include <string>
#include <vector>

#include "lorvex.h"
#include "shared/map_context.h"
#include "vertical/straight_kernels.h"

namespace {

constexpr size_t kGuard = 64;

// An image with an optional second plane ("w12b" words), each plane inside
// guard bytes. Colour samples are addressed by element: a 4:2:2 pixel x has
// luma at 2x and its pair's Cb and Cr at 2(x & ~1) + 1 and + 3; RGBQ pixel x
// has 4x .. 4x + 3. FORMAT_ALPHA images have no colour plane.
struct Image {
    uint8_t format;
    int w, h;
    int epp = 0, esize = 1, elems = 0, stride = 0, astride = 0;
    std::vector<uint8_t> mem, amem;
    Surface s{};

    Image(uint8_t fmt, int width, int height, bool alpha, uint8_t mode = ALPHA_MODE_STRAIGHT)
        : format(fmt), w(width), h(height)
    {
        s.width = w;
        s.height = h;
        s.format = fmt;
        s.alpha_mode = mode;
        if (fmt != FORMAT_ALPHA) {
            const bool pairs = fmt != FORMAT_RGBQ;
            epp = pairs ? 2 : 4;
            esize = fmt == FORMAT_W210 ? 2 : 1;
            elems = (pairs ? (w + 1) & ~1 : w) * epp;
            stride = elems * esize + 8;
            mem.assign(2 * kGuard + size_t(stride) * size_t(h), 0xA5);
            s.data = mem.data() + kGuard;
            s.stride = stride;
        }
        if (alpha) {
            astride = 2 * w + 6;
            amem.assign(2 * kGuard + size_t(astride) * size_t(h), 0x5A);
            s.alpha_format = ALPHA_W12B;
            s.alpha_data = amem.data() + kGuard;
            s.alpha_stride = astride;
        }
    }
    Image(const Image&) = delete;
    Image& operator=(const Image&) = delete;

    int max() const { return format == FORMAT_W210 ? 1023 : 255; }
    size_t at(int e, int y) const { return kGuard + size_t(y) * size_t(stride) + size_t(e) * size_t(esize); }
    int get(int e, int y) const
    {
        const size_t i = at(e, y);
        return esize == 1 ? mem[i] : mem[i] | mem[i + 1] << 8;
    }
    void set(int e, int y, int v)
    {
        const size_t i = at(e, y);
        mem[i] = uint8_t(v);
        if (esize == 2) mem[i + 1] = uint8_t(v >> 8);
    }
    size_t aat(int x, int y) const { return kGuard + size_t(y) * size_t(astride) + 2 * size_t(x); }
    int alpha(int x, int y) const { return amem[aat(x, y)] | amem[aat(x, y) + 1] << 8; }
    void set_alpha(int x, int y, int v)
    {
        amem[aat(x, y)] = uint8_t(v);
        amem[aat(x, y) + 1] = uint8_t(v >> 8);
    }
    // 0 luma (RGBQ sample 0), 1 Cb, 2 Cr, 3 RGBQ sample 3.
    int kind(int e) const { return epp == 4 ? e % 4 : e % 2 == 0 ? 0 : e % 4 == 1 ? 1 : 2; }
    void fill(const int (&v)[4])
    {
        for (int y = 0; y < h; ++y)
            for (int e = 0; e < elems; ++e) set(e, y, v[kind(e)]);
    }
    void fill_alpha(int a)
    {
        for (int y = 0; y < h; ++y)
            for (int x = 0; x < w; ++x) set_alpha(x, y, a);
    }
    void fill_random(std::mt19937& rng)
    {
        for (int y = 0; y < h; ++y)
            for (int e = 0; e < elems; ++e) set(e, y, int(rng() % uint32_t(max() + 1)));
    }
    void fill_alpha_random(std::mt19937& rng)
    {
        for (int y = 0; y < h; ++y)
            for (int x = 0; x < w; ++x) set_alpha(x, y, int(rng() % 4097));
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
            return ::testing::AssertionFailure() << "guard byte " << i << " of the colour plane written";
        const size_t o = i - kGuard;
        const int y = int(o / size_t(want.stride)), e = int(o % size_t(want.stride)) / want.esize;
        if (e >= want.elems) return ::testing::AssertionFailure() << "padding of line " << y << " written";
        return ::testing::AssertionFailure() << "line " << y << " element " << e << " (pixel " << e / want.epp
                                             << "): expected " << want.get(e, y) << ", got " << got.get(e, y);
    }
    for (size_t i = 0; i < want.amem.size(); ++i) {
        if (want.amem[i] == got.amem[i]) continue;
        if (i < kGuard || i >= want.amem.size() - kGuard)
            return ::testing::AssertionFailure() << "guard byte " << i << " of the alpha plane written";
        const size_t o = i - kGuard;
        const int y = int(o / size_t(want.astride)), x = int(o % size_t(want.astride)) / 2;
        if (x >= want.w) return ::testing::AssertionFailure() << "padding of alpha line " << y << " written";
        return ::testing::AssertionFailure() << "alpha of line " << y << " pixel " << x << ": expected "
                                             << want.alpha(x, y) << ", got " << got.alpha(x, y);
    }
    return ::testing::AssertionSuccess();
}

struct Rect {
    float x0, y0, x1, y1;
};
Rect whole(const Image& i) { return {0, 0, float(i.w), float(i.h)}; }

void draw(Image& d, Rect r, const Image& s, Rect sr, uint32_t flags)
{
    map_rectangle(&d.s, r.x0, r.y0, r.x1, r.y1, &s.s, sr.x0, sr.y0, sr.x1, sr.y1, int32_t(flags), 0, 1);
}

const char* format_name(uint8_t f)
{
    switch (f) {
    case FORMAT_ALPHA: return "ALPHA";
    case FORMAT_RGBQ: return "RGBQ";
    case FORMAT_YUY2: return "YUY2";
    case FORMAT_W210: return "W210";
    default: return "other";
    }
}

// Source alpha kinds: none, straight colour, premultiplied colour.
enum SrcAlpha { kNone, kStraight, kPremultiplied };
const char* const kSrcAlphaNames[] = {"no alpha", "straight", "premultiplied"};

std::string pairing(uint8_t sf, SrcAlpha sa, uint8_t df, bool da, int dmode)
{
    std::ostringstream o;
    o << format_name(sf) << " (" << kSrcAlphaNames[sa] << ") into " << format_name(df)
      << (da ? dmode == 2 ? " with premultiplied alpha" : " with straight alpha" : "");
    return o.str();
}

// ---- what a pairing draws ----------------------------------------------------

// One constant source pixel: colour samples by kind at the source's depth and
// an alpha word; one destination pixel likewise.
struct Colour {
    int v[4];
    int a;
};

// The picture a 1:1 area copy of a constant source makes on a constant
// destination: whole pixels at level 4096, overlay, derived from the rules.
//   Into the line buffer: without alpha, or premultiplied, v << shift (32 or
//   8); straight, (((v - o) a) >> 7 (>> 9 for 10 bits)) + 512 or 4096 (RGBQ:
//   (v a) >> 7), alpha 4a in 1/16384.
//   Out of it, one sample: (B + 16) >> 5 or (B + 4) >> 3, clamped in the rows
//   that clamp.
//   Composition, whole pixel, level 4096:
//     no alpha anywhere, and _DA      D = S (and Da = 4096)
//     _SA, A = 4a                     clamp((((D - o)(16384 - A) + 8192) >> 14) + S)
//     _SA_DA, A = a, premultiplied    Da = ((Da (4096 - A) + 2048) >> 12) + A
//                                     D = clamp((((D - o)(4096 - A) + 2048) >> 12) + S)
//     _SA_DA, A = a, straight         d = ((4096 - A) Da + 2048) >> 12, t = A + d
//                                     Da = t, D = clamp((((D - o) d + ((S - o) << 12)) / t) + o)
//     alpha only                      Da = (((4096 - A) Da + 2048) >> 12) + A
// A straight source into a destination without alpha runs the fast form of
// _SA (clamp is not set), whose S stays in buffer units.
//
// On the area path a 1:1 copy paints its first and last destination pixel
// as constant regions: those read the buffer by truncation, S = B >> 5 or
// B >> 3, and with coverage 1 their partial rule gives the value above. A
// straight source whose premultiplied value falls between two stored steps
// shows the difference (`truncate`).
void expected_pixel(uint8_t sf, SrcAlpha sa, const Colour& src, uint8_t df, bool da, int dmode, bool truncate,
                    int (&d)[4], int& dalpha)
{
    const bool pairs = sf != FORMAT_RGBQ;
    const int in_shift = sf == FORMAT_W210 ? 3 : 5, out_shift = df == FORMAT_W210 ? 3 : 5;
    const int premul_shift = sf == FORMAT_W210 ? 9 : 7;
    const int so[4] = {sf == FORMAT_RGBQ ? 0 : sf == FORMAT_W210 ? 64 : 16,
                       sf == FORMAT_RGBQ ? 0 : sf == FORMAT_W210 ? 512 : 128,
                       sf == FORMAT_RGBQ ? 0 : sf == FORMAT_W210 ? 512 : 128, 0};
    const int dmax = df == FORMAT_W210 ? 1023 : 255;
    const int dof[4] = {df == FORMAT_RGBQ ? 0 : df == FORMAT_W210 ? 64 : 16,
                        df == FORMAT_RGBQ ? 0 : df == FORMAT_W210 ? 512 : 128,
                        df == FORMAT_RGBQ ? 0 : df == FORMAT_W210 ? 512 : 128, 0};
    const auto lim = [&](int64_t v) { return int(std::clamp<int64_t>(v, 0, dmax)); };

    if (sf == FORMAT_ALPHA) {
        const int64_t A = src.a;
        dalpha = int((((4096 - A) * dalpha + 2048) >> 12) + A);
        return;
    }
    const int n = pairs ? 3 : 4;
    int S[4] = {};
    int64_t B13[4] = {};
    for (int k = 0; k < n; ++k) {
        int64_t B;
        if (sa == kStraight) {
            const int base = pairs ? (k == 0 ? 512 : 4096) : 0;
            B = ((int64_t(src.v[k] - so[k]) * src.a) >> premul_shift) + base;
        } else {
            B = int64_t(src.v[k]) << in_shift;
        }
        B13[k] = B;
        S[k] = int((B + (truncate ? 0 : 1 << (out_shift - 1))) >> out_shift);
        if (sf == FORMAT_W210 && df == FORMAT_YUY2) S[k] = lim(S[k]);
    }
    if (sa == kNone) {
        for (int k = 0; k < n; ++k) d[k] = S[k];
        if (da) dalpha = 4096;
        return;
    }
    if (!da && sa == kStraight && !(sf == FORMAT_W210 && df == FORMAT_YUY2) && !truncate) {
        // The fast form: (B + (((D - o) m) >> 9) + 16) >> 5 (10 bits: >> 11, + 4,
        // >> 3), luma and RGBQ unclamped. With coverage 1 its partial rule gives
        // the same value.
        const int64_t m = 16384 - 4 * int64_t(src.a);
        for (int k = 0; k < n; ++k) {
            const int64_t v = (B13[k] + (((int64_t(d[k]) - dof[k]) * m) >> (14 - out_shift)) +
                               (1 << (out_shift - 1))) >> out_shift;
            d[k] = pairs && k ? lim(v) : int(v);
        }
        return;
    }
    if (!da) {
        const int64_t A = 4 * int64_t(src.a);
        for (int k = 0; k < n; ++k) d[k] = lim((((int64_t(d[k]) - dof[k]) * (16384 - A) + 8192) >> 14) + S[k]);
        return;
    }
    const int64_t A = src.a, Da = dalpha;
    if (dmode == 2) {
        dalpha = int(((Da * (4096 - A) + 2048) >> 12) + A);
        for (int k = 0; k < n; ++k) d[k] = lim((((int64_t(d[k]) - dof[k]) * (4096 - A) + 2048) >> 12) + S[k]);
    } else {
        const int64_t dd = ((4096 - A) * Da + 2048) >> 12, t = A + dd;
        dalpha = int(t);
        for (int k = 0; k < n; ++k)
            d[k] = lim((((int64_t(d[k]) - dof[k]) * dd + (int64_t(S[k] - dof[k]) << 12)) / t) + dof[k]);
    }
}

// Source and destination colours by format, alike in buffer units: 8-bit
// (200, 100, 180) is 10-bit (800, 400, 720).
Colour source_colour(uint8_t f, int a)
{
    if (f == FORMAT_W210) return {{800, 400, 720, 0}, a};
    if (f == FORMAT_RGBQ) return {{200, 100, 180, 60}, a};
    return {{200, 100, 180, 0}, a};
}
Colour dest_colour(uint8_t f)
{
    if (f == FORMAT_W210) return {{200, 600, 240, 0}, 1024};
    if (f == FORMAT_RGBQ) return {{10, 20, 30, 40}, 1024};
    return {{50, 150, 60, 0}, 1024};
}

struct Pairing {
    uint8_t sf;
    SrcAlpha sa;
    uint8_t df;
    bool da;
};

// The 24 rows of the pairing table, with the rows of a premultiplied source
// written out (31 pairings).
std::vector<Pairing> all_pairings()
{
    std::vector<Pairing> p;
    for (uint8_t sf : {FORMAT_YUY2, FORMAT_W210})
        for (SrcAlpha sa : {kNone, kStraight, kPremultiplied})
            for (uint8_t df : {FORMAT_YUY2, FORMAT_W210})
                for (bool da : {false, true}) p.push_back({sf, sa, df, da});
    for (SrcAlpha sa : {kNone, kStraight, kPremultiplied})
        for (bool da : {false, true}) p.push_back({FORMAT_RGBQ, sa, FORMAT_RGBQ, da});
    p.push_back({FORMAT_ALPHA, kPremultiplied, FORMAT_ALPHA, true});
    return p;
}

uint8_t mode_of(SrcAlpha sa) { return sa == kStraight ? ALPHA_MODE_STRAIGHT : ALPHA_MODE_PREMULTIPLIED; }

// Draws a 1:1 area copy of a constant 6x3 source over a constant destination
// and compares with the picture derived above.
void check_pairing(const Pairing& p, int src_alpha, int dmode, int src_mode_override = -1)
{
    constexpr int W = 6, H = 3;
    const Colour sc = source_colour(p.sf, src_alpha), dc = dest_colour(p.df);
    Image src(p.sf, W, H, p.sa != kNone, src_mode_override >= 0 ? uint8_t(src_mode_override) : mode_of(p.sa));
    Image dst(p.df, W, H, p.da, uint8_t(dmode)), want(p.df, W, H, p.da, uint8_t(dmode));
    if (p.sf != FORMAT_ALPHA) src.fill(sc.v);
    if (p.sa != kNone) src.fill_alpha(sc.a);
    if (p.df != FORMAT_ALPHA) dst.fill(dc.v);
    if (p.da) dst.fill_alpha(dc.a);
    want.copy_from(dst);
    int d[4] = {dc.v[0], dc.v[1], dc.v[2], dc.v[3]}, edge[4] = {dc.v[0], dc.v[1], dc.v[2], dc.v[3]};
    int dalpha = dc.a, edge_alpha = dc.a;
    expected_pixel(p.sf, p.sa, sc, p.df, p.da, dmode, false, d, dalpha);
    expected_pixel(p.sf, p.sa, sc, p.df, p.da, dmode, true, edge, edge_alpha);
    if (p.df != FORMAT_ALPHA) {
        want.fill(d);
        // Pixel 0 with its pair's chroma, and the luma of the last (odd) pixel.
        for (int y = 0; y < H; ++y)
            for (int e = 0; e < want.elems; ++e) {
                const int x = e / want.epp, k = want.kind(e), owner = want.epp == 2 && k ? x & ~1 : x;
                if (owner == 0 || (x == W - 1 && (want.epp == 4 || k == 0))) want.set(e, y, edge[k]);
            }
    }
    if (p.da) want.fill_alpha(dalpha);
    ASSERT_EQ(dalpha, edge_alpha);

    draw(dst, whole(dst), src, whole(src), 0);
    EXPECT_TRUE(same(want, dst)) << pairing(p.sf, p.sa, p.df, p.da, dmode) << ", source alpha " << src_alpha;
}

TEST(AlphaPairings, EveryRowDrawsItsComposition)
{
    for (const Pairing& p : all_pairings())
        for (int dmode : {1, 2})
            for (int a : {4096, 2048, 1000}) {
                if (!p.da && dmode == 2) continue;
                check_pairing(p, a, dmode);
            }
}

// A source counts as straight only at alpha_mode 1; a destination counts as
// premultiplied only at 2. The two readings of a half-transparent source,
// and of a destination with alpha, differ, so each value shows which was
// taken.
TEST(AlphaPairings, AlphaModeIsReadAsymmetrically)
{
    for (uint8_t f : {FORMAT_YUY2, FORMAT_W210, FORMAT_RGBQ}) {
        // Source: 0, 3 and 255 behave as 2 (premultiplied).
        for (int mode : {0, 3, 255})
            for (bool da : {false, true}) {
                SCOPED_TRACE("source alpha_mode " + std::to_string(mode));
                check_pairing({f, kPremultiplied, f, da}, 2048, 1, mode);
            }
        // Destination: 0, 3 and 255 behave as 1 (straight).
        for (int mode : {0, 3, 255}) {
            SCOPED_TRACE("destination alpha_mode " + std::to_string(mode));
            constexpr int W = 4, H = 2;
            Image src(f, W, H, true, ALPHA_MODE_STRAIGHT);
            Image got(f, W, H, true, uint8_t(mode)), as_straight(f, W, H, true, ALPHA_MODE_STRAIGHT),
                as_pre(f, W, H, true, ALPHA_MODE_PREMULTIPLIED);
            src.fill(source_colour(f, 0).v);
            src.fill_alpha(2048);
            for (Image* d : {&got, &as_straight, &as_pre}) {
                d->fill(dest_colour(f).v);
                d->fill_alpha(1024);
                draw(*d, whole(*d), src, whole(src), 0);
            }
            EXPECT_TRUE(same(as_straight, got));
            EXPECT_FALSE(same(as_pre, got));
        }
    }
    // An alpha-only image has no colour to associate: every mode draws alike.
    for (int mode : {0, 1, 2, 3}) {
        SCOPED_TRACE("alpha-only source, alpha_mode " + std::to_string(mode));
        check_pairing({FORMAT_ALPHA, kPremultiplied, FORMAT_ALPHA, true}, 2048, 1, mode);
    }
}

// Combinations outside the table return before anything is written, colour
// plane and alpha plane alike.
TEST(AlphaPairings, RefusedCombinationsLeaveTheDestinationAlone)
{
    struct Refused {
        const char* what;
        uint8_t sf;
        int s_alpha_format;
        uint8_t s_mode;
        uint8_t df;
        int d_alpha_format;
        uint32_t flags;
    };
    const uint32_t area = 0, edge = lorvex_flag_filters(1, 7);
    const Refused cases[] = {
        {"source alpha_format 1", FORMAT_YUY2, 1, 2, FORMAT_YUY2, 0, area},
        {"source alpha_format 2", FORMAT_YUY2, 2, 1, FORMAT_YUY2, 3, area},
        {"source alpha_format 4", FORMAT_RGBQ, 4, 2, FORMAT_RGBQ, 0, area},
        {"destination alpha_format 1", FORMAT_YUY2, 0, 2, FORMAT_YUY2, 1, area},
        {"destination alpha_format 2", FORMAT_W210, 3, 1, FORMAT_W210, 2, area},
        {"destination alpha_format 2, RGBQ", FORMAT_RGBQ, 3, 2, FORMAT_RGBQ, 2, area},
        {"RGBQ into YUY2", FORMAT_RGBQ, 0, 2, FORMAT_YUY2, 0, area},
        {"RGBQ with alpha into W210 with alpha", FORMAT_RGBQ, 3, 1, FORMAT_W210, 3, area},
        {"YUY2 into RGBQ", FORMAT_YUY2, 0, 2, FORMAT_RGBQ, 0, area},
        {"W210 with alpha into RGBQ with alpha", FORMAT_W210, 3, 2, FORMAT_RGBQ, 3, area},
        {"ALPHA source without alpha_format 3", FORMAT_ALPHA, 0, 2, FORMAT_ALPHA, 3, area},
        {"ALPHA destination without alpha_format 3", FORMAT_ALPHA, 3, 2, FORMAT_ALPHA, 0, area},
        {"ALPHA into YUY2 with alpha", FORMAT_ALPHA, 3, 2, FORMAT_YUY2, 3, area},
        {"YUY2 with alpha into ALPHA", FORMAT_YUY2, 3, 2, FORMAT_ALPHA, 3, area},
        {"RGBQ with alpha into ALPHA", FORMAT_RGBQ, 3, 2, FORMAT_ALPHA, 3, area},
        {"word source", FORMAT_WORD, 0, 2, FORMAT_YUY2, 0, area},
        {"yuvq source", FORMAT_YUVQ, 0, 2, FORMAT_YUY2, 3, area},
        {"code 4 destination", FORMAT_YUY2, 0, 2, 4, 0, area},
        {"code 10 destination", FORMAT_RGBQ, 0, 2, FORMAT_WIDE_ALPHA, 0, area},
        {"vertical kind 7, premultiplied YUY2 with alpha", FORMAT_YUY2, 3, 2, FORMAT_YUY2, 0, edge},
        {"vertical kind 7, premultiplied RGBQ with alpha", FORMAT_RGBQ, 3, 0, FORMAT_RGBQ, 3, edge},
        {"vertical kind 7, straight YUY2", FORMAT_YUY2, 3, 1, FORMAT_YUY2, 3, edge},
    };
    constexpr int W = 8, H = 10;
    std::mt19937 rng(11);
    for (const Refused& r : cases) {
        SCOPED_TRACE(r.what);
        // The planes are laid out as the nearest format the test knows.
        const auto layout = [](uint8_t f) -> uint8_t {
            return f == FORMAT_ALPHA || f == FORMAT_W210 || f == FORMAT_RGBQ ? f : uint8_t(FORMAT_YUY2);
        };
        Image src(layout(r.sf), W, H / 2, true, r.s_mode), dst(layout(r.df), W, H, true, 1), want(layout(r.df), W, H, true, 1);
        src.s.format = r.sf;
        src.s.alpha_format = r.s_alpha_format;
        dst.s.format = r.df;
        dst.s.alpha_format = r.d_alpha_format;
        src.fill_random(rng);
        src.fill_alpha(2048);
        dst.fill_random(rng);
        dst.fill_alpha(1000);
        want.copy_from(dst);
        draw(dst, whole(dst), src, whole(src), r.flags);  // kind 7 magnifies: 5 lines into 10
        EXPECT_TRUE(same(want, dst));
    }
    // The same calls with the alpha formats corrected do draw.
    Image src(FORMAT_YUY2, W, H / 2, true, ALPHA_MODE_PREMULTIPLIED), dst(FORMAT_YUY2, W, H, true, 1),
        untouched(FORMAT_YUY2, W, H, true, 1);
    src.fill_random(rng);
    src.fill_alpha(2048);
    dst.fill_random(rng);
    dst.fill_alpha(1000);
    untouched.copy_from(dst);
    draw(dst, whole(dst), src, whole(src), lorvex_flag_filters(1, 1));
    EXPECT_FALSE(same(untouched, dst));
}

// The rows marked with clamp: the general form of _SA (which clamps) instead
// of the fast one (whose luma is not clamped), and 10-bit 1023 limited to 255
// when it leaves the buffer for 8 bits.
TEST(AlphaPairings, ClampedRowsLimitTheirSamples)
{
    // W210 1023 is 8184 units: (8184 + 16) >> 5 = 256, which the clamp limits
    // to 255 in every YUY2 family; unclamped it would store 0.
    for (SrcAlpha sa : {kNone, kStraight, kPremultiplied})
        for (bool da : {false, true}) {
            SCOPED_TRACE(pairing(FORMAT_W210, sa, FORMAT_YUY2, da, 1));
            Image src(FORMAT_W210, 4, 2, sa != kNone, mode_of(sa)), dst(FORMAT_YUY2, 4, 2, da, 1);
            const int white[4] = {1023, 512, 512, 0}, black[4] = {16, 128, 128, 0};
            src.fill(white);
            if (sa != kNone) src.fill_alpha(4096);
            dst.fill(black);
            if (da) dst.fill_alpha(0);
            draw(dst, whole(dst), src, whole(src), 0);
            for (int x = 0; x < 4; ++x) EXPECT_EQ(dst.get(2 * x, 1), 255) << "pixel " << x;
        }
    // A premultiplied source runs with clamp set, and so with the general form
    // of _SA. 2.5 source pixels of 255 at alpha 1024 into 2.5 destination
    // pixels of 250: pixel 2 is covered by half (c14 8192), e = (8192 4096 +
    // 8192) >> 14 = 2048: ((234 14336 + 239 8192 + 8192) >> 14) + 16 = 340,
    // clamped to 255. (The fast form would leave that luma unclamped: 340 is
    // stored as 84.) RGBQ: (250 14336 + 255 8192 + 8192) >> 14 = 346, 255.
    for (uint8_t f : {FORMAT_YUY2, FORMAT_RGBQ}) {
        SCOPED_TRACE(format_name(f));
        Image src(f, 4, 1, true, ALPHA_MODE_PREMULTIPLIED), dst(f, 4, 1, false);
        const int full[4] = {255, 255, 255, 255}, under[4] = {250, 250, 250, 250};
        src.fill(full);
        src.fill_alpha(1024);
        dst.fill(under);
        draw(dst, {0, 0, 2.5f, 1}, src, {0, 0, 2.5f, 1}, 0);
        EXPECT_EQ(dst.get(f == FORMAT_RGBQ ? 8 : 4, 0), 255);
    }
}

// ---- straight sources and their premultiplied twins --------------------------
//
// A straight source is premultiplied line by line on its way into the buffer,
// with 1/32 (8 bits) or 1/8 (10 bits) of a stored step kept; its twin holds
// the premultiplied colour rounded to whole steps, and runs with clamp set
// (its alpha is filtered in a pass of its own), which selects the general
// form of _SA where the straight source may take the fast one. The two give
// the same picture exactly where the buffers are equal and the forms agree:
//   - alpha 4096 everywhere: P = 32v - 32o (8v - 8o) and the bank sums are
//     the plain ones; alpha 0 everywhere draws nothing in both;
//   - black and neutral at any alpha: P = 0, the buffer holds 512 and 4096;
//   - a 1:1 copy where (v - o) a / 4096 is a whole step;
// into destinations with alpha (one family, always clamping) for any filter,
// and into destinations without alpha for filters with negative lobes (clamp
// on both sides) or on whole pixels whose buffer values are whole steps (the
// fast and the general whole-pixel rules then agree). They
// differ where the straight colour's premultiplied value falls between two
// steps; where an interpolated sample is rounded to buffer units by the fast
// form and then to a step, where the general form rounds once; and on the
// partly covered pixels of the fast form, whose weight e keeps 5 more bits.

// Makes the premultiplied twin of a straight source, for colours where the
// product is exact or irrelevant: v' = o + (v - o) a / 4096 rounded down.
void premultiply_into(const Image& straight, Image& twin)
{
    twin.copy_from(straight);
    const int so[4] = {straight.format == FORMAT_RGBQ ? 0 : straight.format == FORMAT_W210 ? 64 : 16,
                       straight.format == FORMAT_RGBQ ? 0 : straight.format == FORMAT_W210 ? 512 : 128,
                       straight.format == FORMAT_RGBQ ? 0 : straight.format == FORMAT_W210 ? 512 : 128, 0};
    for (int y = 0; y < straight.h; ++y)
        for (int e = 0; e < straight.elems; ++e) {
            const int k = straight.kind(e);
            const int x = e / straight.epp, owner = straight.epp == 2 && k ? x & ~1 : x;
            const int64_t v = straight.get(e, y) - so[k];
            int64_t p = v * straight.alpha(owner, y);
            p = p >= 0 ? p / 4096 : -((-p + 4095) / 4096);
            twin.set(e, y, int(p + so[k]));
        }
}

struct Mapping {
    const char* what;
    Rect dst;
    Rect src;
    uint32_t flags;
    bool whole_pixels;  // every destination pixel wholly covered
    bool on_grid;       // ... and its samples exact stored steps
    bool negative_lobes;
};
const Mapping kMappings[] = {
    {"1:1 area", {0, 0, 12, 6}, {0, 0, 12, 6}, 0, true, true, false},
    {"2:1 area", {0, 0, 6, 3}, {0, 0, 12, 6}, 0, true, false, false},
    {"fractional area", {0.5f, 0.25f, 10.75f, 5.5f}, {0, 0, 12, 6}, 0, false, false, false},
    {"linear magnification", {0, 0, 12, 6}, {1, 0.5f, 8, 5}, lorvex_flag_filters(1, 1), true, false, false},
    {"cubic magnification, fractional", {0.25f, 0.5f, 11.5f, 5.75f}, {0.3f, 0.2f, 9.1f, 5.3f},
     lorvex_flag_filters(2, 2), false, false, true},
    {"lanczos 3 reduction", {0, 0, 8, 4}, {0, 0, 12, 6}, lorvex_flag_filters(5, 5), true, false, true},
    {"cubic tile, fractional", {0.5f, 0.5f, 11.5f, 5.5f}, {0, 0, 12, 6}, lorvex_flag_filters(2, 2) | LORVEX_TILE,
     false, false, true},
};

// Draws the straight source and its twin into two copies of one destination
// and compares them.
::testing::AssertionResult twins_agree(const Image& straight, const Image& twin, uint8_t df, bool da, int dmode,
                                       const Mapping& m, uint32_t seed)
{
    std::mt19937 rng(seed);
    Image a(df, 12, 6, da, uint8_t(dmode)), b(df, 12, 6, da, uint8_t(dmode));
    a.fill_random(rng);
    if (da) a.fill_alpha_random(rng);
    b.copy_from(a);
    draw(a, m.dst, straight, m.src, m.flags);
    draw(b, m.dst, twin, m.src, m.flags);
    return same(a, b);
}

TEST(AlphaPairings, StraightAndPremultipliedTwinsAgree)
{
    std::mt19937 rng(5);
    for (uint8_t sf : {FORMAT_YUY2, FORMAT_W210, FORMAT_RGBQ})
        for (int picture = 0; picture < 4; ++picture) {
            // 0: random colour, alpha 4096; 1: random colour, alpha 0;
            // 2: black and neutral, random alpha; 3: (v - o) even, alpha 2048.
            Image straight(sf, 12, 6, true, ALPHA_MODE_STRAIGHT), twin(sf, 12, 6, true, ALPHA_MODE_PREMULTIPLIED);
            straight.fill_random(rng);
            if (picture == 2) {
                const int black[4] = {sf == FORMAT_RGBQ ? 0 : sf == FORMAT_W210 ? 64 : 16,
                                      sf == FORMAT_RGBQ ? 0 : sf == FORMAT_W210 ? 512 : 128,
                                      sf == FORMAT_RGBQ ? 0 : sf == FORMAT_W210 ? 512 : 128, 0};
                straight.fill(black);
            }
            if (picture == 3)
                for (int y = 0; y < straight.h; ++y)
                    for (int e = 0; e < straight.elems; ++e) straight.set(e, y, straight.get(e, y) & ~1);
            if (picture == 2)
                straight.fill_alpha_random(rng);
            else
                straight.fill_alpha(picture == 0 ? 4096 : picture == 1 ? 0 : 2048);
            premultiply_into(straight, twin);
            twin.s.alpha_mode = ALPHA_MODE_PREMULTIPLIED;

            const std::vector<uint8_t> dests =
                sf == FORMAT_RGBQ ? std::vector<uint8_t>{FORMAT_RGBQ} : std::vector<uint8_t>{FORMAT_YUY2, FORMAT_W210};
            for (uint8_t df : dests)
                for (const Mapping& m : kMappings) {
                    if (picture == 3 && std::string(m.what) != "1:1 area") continue;
                    for (int dmode : {1, 2}) {
                        EXPECT_TRUE(twins_agree(straight, twin, df, true, dmode, m, 17))
                            << format_name(sf) << " picture " << picture << " into " << format_name(df)
                            << " with alpha, mode " << dmode << ", " << m.what;
                    }
                    // Without destination alpha: where both run the general form, where
                    // nothing is drawn, or on whole pixels whose buffer values leave no
                    // extra bits to the fast form.
                    const bool black = picture == 2;
                    if (m.negative_lobes || picture == 1 || m.on_grid || (black && m.whole_pixels)) {
                        EXPECT_TRUE(twins_agree(straight, twin, df, false, 1, m, 17))
                            << format_name(sf) << " picture " << picture << " into " << format_name(df) << ", "
                            << m.what;
                    }
                }
        }
}

// Where they legitimately differ: straight 201 at alpha 2048 is
// ((185 2048) >> 7) + 512 = 3472 units, 108.5 steps, and a whole pixel over
// black takes (3472 + 0 + 16) >> 5 = 109; its twin must hold 108 (or 109),
// which gives 108. One step apart, each exact.
TEST(AlphaPairings, StraightKeepsTheFractionItsTwinCannotHold)
{
    Image straight(FORMAT_YUY2, 4, 1, true, ALPHA_MODE_STRAIGHT), twin(FORMAT_YUY2, 4, 1, true, ALPHA_MODE_PREMULTIPLIED);
    const int s[4] = {201, 128, 128, 0}, t[4] = {108, 128, 128, 0}, black[4] = {16, 128, 128, 0};
    straight.fill(s);
    straight.fill_alpha(2048);
    twin.fill(t);
    twin.fill_alpha(2048);
    Image a(FORMAT_YUY2, 4, 1, false), b(FORMAT_YUY2, 4, 1, false);
    a.fill(black);
    b.fill(black);
    draw(a, whole(a), straight, whole(straight), 0);
    draw(b, whole(b), twin, whole(twin), 0);
    // Pixels 1 and 2 are drawn by the main kernel (1:1 area paints the first
    // and the last pixel as constant regions, which truncate: 3472 >> 5 = 108).
    for (int x : {1, 2}) {
        EXPECT_EQ(a.get(2 * x, 0), 109) << "pixel " << x;
        EXPECT_EQ(b.get(2 * x, 0), 108) << "pixel " << x;
    }
    EXPECT_EQ(a.get(0, 0), 108);
}

// ---- destination alpha that adds up ---------------------------------------------

// In tile mode the partly covered pixels of a _DA destination add their
// coverage to the alpha word without a limit, and an alpha-only destination
// adds as 16-bit words: two half-covered draws on 4000 give 6048 and 8096;
// on 65000 the alpha-only word wraps.
TEST(AlphaPairings, TiledDestinationAlphaIsNeverClamped)
{
    Image src(FORMAT_YUY2, 4, 1, false), dst(FORMAT_YUY2, 6, 1, true, ALPHA_MODE_PREMULTIPLIED);
    const int black[4] = {16, 128, 128, 0};
    src.fill(black);
    dst.fill(black);
    dst.fill_alpha(4000);
    draw(dst, {0.5f, 0, 4.5f, 1}, src, whole(src), LORVEX_TILE);
    EXPECT_EQ(dst.alpha(0, 0), 6048);
    EXPECT_EQ(dst.alpha(4, 0), 6048);
    draw(dst, {0.5f, 0, 4.5f, 1}, src, whole(src), LORVEX_TILE);
    EXPECT_EQ(dst.alpha(0, 0), 8096);
    EXPECT_EQ(dst.alpha(2, 0), 4096);  // a whole pixel belongs to the tile alone
    EXPECT_EQ(dst.alpha(5, 0), 4000);

    // c12 2048 of A 4096: e = 2048 per half pixel; 65000 + 2048 = 67048 wraps to 1512.
    Image asrc(FORMAT_ALPHA, 4, 1, true), adst(FORMAT_ALPHA, 6, 1, true);
    asrc.fill_alpha(4096);
    adst.fill_alpha(65000);
    draw(adst, {0.5f, 0, 4.5f, 1}, asrc, whole(asrc), LORVEX_TILE);
    EXPECT_EQ(adst.alpha(0, 0), 1512);
    EXPECT_EQ(adst.alpha(1, 0), 4096);  // a whole pixel: overwritten with A
    EXPECT_EQ(adst.alpha(4, 0), 1512);
}

// ---- the second plane through fields, line phases and strips -------------------

// A view of every other line of an image: the lines of one field.
Surface field_view(const Image& i, bool odd)
{
    Surface v = i.s;
    v.height = odd ? i.h / 2 : (i.h + 1) / 2;
    if (odd) {
        if (v.data) v.data = static_cast<uint8_t*>(v.data) + v.stride;
        if (v.alpha_data) v.alpha_data = static_cast<uint8_t*>(v.alpha_data) + v.alpha_stride;
    }
    v.stride *= 2;
    v.alpha_stride *= 2;
    return v;
}

// A destination field is drawn into the field's lines of both planes, as the
// same call without the field flag draws into a view of those lines, with the
// source moved by a quarter of a field line's step; a source field reads the
// field's lines of both planes.
TEST(AlphaPairings, SecondPlanesFollowTheFields)
{
    std::mt19937 rng(21);
    const Pairing kinds[] = {{FORMAT_YUY2, kStraight, FORMAT_YUY2, true},
                             {FORMAT_W210, kPremultiplied, FORMAT_YUY2, true},
                             {FORMAT_RGBQ, kStraight, FORMAT_RGBQ, true},
                             {FORMAT_YUY2, kNone, FORMAT_W210, true},
                             {FORMAT_ALPHA, kPremultiplied, FORMAT_ALPHA, true}};
    for (const Pairing& p : kinds)
        for (bool odd : {false, true}) {
            SCOPED_TRACE(pairing(p.sf, p.sa, p.df, p.da, 2) + (odd ? ", odd field" : ", even field"));
            Image src(p.sf, 8, 8, p.sa != kNone, mode_of(p.sa));
            src.fill_random(rng);
            if (p.sa != kNone) src.fill_alpha_random(rng);
            const uint32_t flags = lorvex_flag_filters(1, 1);

            // Destination field: 8 frame lines from 8 source lines; the field has
            // 4, and the source moves by 8 * (odd ? 0.25 : -0.25) / 4.
            Image got(p.df, 8, 8, p.da, 2), want(p.df, 8, 8, p.da, 2);
            got.fill_random(rng);
            if (p.da) got.fill_alpha_random(rng);
            want.copy_from(got);
            draw(got, whole(got), src, whole(src), flags | (odd ? LORVEX_DEST_ODD_FIELD : LORVEX_DEST_EVEN_FIELD));
            Surface view = field_view(want, odd);
            const float off = odd ? 0.5f : -0.5f;
            map_rectangle(&view, 0, 0, 8, 4, &src.s, 0, off, 8, 8 + off, int32_t(flags), 0, 1);
            EXPECT_TRUE(same(want, got)) << "destination field";

            // Source field: lines 2k (+1) of both planes, at half the positions.
            Image got2(p.df, 8, 4, p.da, 2), want2(p.df, 8, 4, p.da, 2);
            got2.fill_random(rng);
            if (p.da) got2.fill_alpha_random(rng);
            want2.copy_from(got2);
            draw(got2, whole(got2), src, whole(src), flags | (odd ? LORVEX_SOURCE_ODD_FIELD : LORVEX_SOURCE_EVEN_FIELD));
            const Surface sview = field_view(src, odd);
            const float soff = odd ? -0.25f : 0.25f;
            map_rectangle(&want2.s, 0, 0, 8, 4, &sview, 0, soff, 8, 4 + soff, int32_t(flags), 0, 1);
            EXPECT_TRUE(same(want2, got2)) << "source field";
        }
}

// Calls that split the lines by phase draw what one call draws, in both
// planes; and a line long enough for several strips (each strip keeps its
// alpha section behind its colour) draws what separate calls of one strip
// each draw. Linear 1:1 has no constant regions, so pieces join exactly.
TEST(AlphaPairings, SecondPlanesAcrossLinePhasesAndStrips)
{
    std::mt19937 rng(22);
    for (const Pairing& p : {Pairing{FORMAT_YUY2, kStraight, FORMAT_YUY2, true},
                             Pairing{FORMAT_RGBQ, kPremultiplied, FORMAT_RGBQ, true},
                             Pairing{FORMAT_W210, kStraight, FORMAT_W210, false},
                             Pairing{FORMAT_ALPHA, kPremultiplied, FORMAT_ALPHA, true}}) {
        SCOPED_TRACE(pairing(p.sf, p.sa, p.df, p.da, 1));
        {
            Image src(p.sf, 9, 7, true, mode_of(p.sa)), all(p.df, 12, 9, p.da, 1), split(p.df, 12, 9, p.da, 1);
            src.fill_random(rng);
            src.fill_alpha_random(rng);
            all.fill_random(rng);
            if (p.da) all.fill_alpha_random(rng);
            split.copy_from(all);
            const uint32_t flags = lorvex_flag_filters(2, 2);
            map_rectangle(&all.s, 0.5f, 0.25f, 11.5f, 8.5f, &src.s, 0, 0, 9, 7, int32_t(flags), 0, 1);
            for (int phase = 0; phase < 3; ++phase)
                map_rectangle(&split.s, 0.5f, 0.25f, 11.5f, 8.5f, &src.s, 0, 0, 9, 7, int32_t(flags), phase, 3);
            EXPECT_TRUE(same(all, split)) << "line phases";
        }
        {
            constexpr int W = 12000, piece = 1000;
            Image src(p.sf, W, 2, true, mode_of(p.sa)), all(p.df, W, 2, p.da, 1), pieces(p.df, W, 2, p.da, 1);
            src.fill_random(rng);
            if (p.sa == kStraight)
                src.fill_alpha(4096);  // on the stored grid: the pieces' edges do not truncate
            else
                src.fill_alpha_random(rng);
            all.fill_random(rng);
            if (p.da) all.fill_alpha_random(rng);
            pieces.copy_from(all);
            const uint32_t flags = lorvex_flag_filters(1, 1);
            map_rectangle(&all.s, 0, 0, W, 2, &src.s, 0, 0, W, 2, int32_t(flags), 0, 1);
            for (int x = 0; x < W; x += piece)
                map_rectangle(&pieces.s, float(x), 0, float(x + piece), 2, &src.s, float(x), 0, float(x + piece), 2,
                              int32_t(flags), 0, 1);
            EXPECT_TRUE(same(pieces, all)) << "one call of several strips";
        }
    }
}

// Images without chroma (alpha only, RGBQ) have no chroma filter to soften:
// the field changes nothing, also where it would widen a 4:2:2 filter.
TEST(AlphaPairings, ChromaSoftenLeavesImagesWithoutChromaAlone)
{
    std::mt19937 rng(23);
    for (const Pairing& p : {Pairing{FORMAT_ALPHA, kPremultiplied, FORMAT_ALPHA, true},
                             Pairing{FORMAT_RGBQ, kStraight, FORMAT_RGBQ, true}}) {
        SCOPED_TRACE(pairing(p.sf, p.sa, p.df, p.da, 1));
        Image src(p.sf, 10, 4, true, mode_of(p.sa)), plain(p.df, 14, 6, true, 1), soft(p.df, 14, 6, true, 1);
        src.fill_random(rng);
        src.fill_alpha_random(rng);
        plain.fill_random(rng);
        plain.fill_alpha_random(rng);
        soft.copy_from(plain);
        for (int h : {1, 2, 5}) {
            const uint32_t flags = lorvex_flag_filters(h, 2);
            map_rectangle(&plain.s, 0.5f, 0, 13.5f, 6, &src.s, 0, 0, 10, 4, int32_t(flags), 0, 1);
            map_rectangle(&soft.s, 0.5f, 0, 13.5f, 6, &src.s, 0, 0, 10, 4, int32_t(flags | lorvex_flag_chroma_soften(3)),
                          0, 1);
            EXPECT_TRUE(same(plain, soft)) << "hfilter " << h;
        }
    }
}

// ---- the straight vertical tables ----------------------------------------------

// Runs a straight vertical kernel over one strip: source lines of colour
// samples and alpha words, into `line` and `line_a`.
template <class Sample>
struct VRig {
    std::vector<Sample> colour;        // lines of `epl` elements
    std::vector<uint16_t> alpha;       // lines of `px` words
    std::vector<int16_t> buf = std::vector<int16_t>(1024, -1);
    std::vector<int16_t> abuf = std::vector<int16_t>(256, -1);
    int epl, px, lines;
    lorvex::MapContext c;
    lorvex::StripRecord s{};

    VRig(int elements_per_pixel, int pixels, int nlines)
        : colour(size_t(elements_per_pixel * pixels * nlines)), alpha(size_t(pixels * nlines)),
          epl(elements_per_pixel * pixels), px(pixels), lines(nlines)
    {
        c.line = buf.data() + 64;
        c.line_a = abuf.data() + 16;
        c.src_stride = int32_t(epl * sizeof(Sample));
        c.src_stride2 = int32_t(px * 2);
        c.lines[0] = reinterpret_cast<const uint8_t*>(colour.data());
        c.lines2[0] = reinterpret_cast<const uint8_t*>(alpha.data());
        s.src_first = 0;
        s.src_end = pixels;
        s.pad_left = 0;
    }
    Sample& at(int line, int e) { return colour[size_t(line * epl + e)]; }
    uint16_t& a(int line, int x) { return alpha[size_t(line * px + x)]; }
};

TEST(AlphaPairings, StraightTablesPremultiplyOnTheWayIn)
{
    using lorvex::V_RGBQ_STRAIGHT;
    using lorvex::V_W210_STRAIGHT;
    using lorvex::V_YUY2_STRAIGHT;
    using lorvex::vslot::line_above;
    // 8 bits, a pair with alpha 3000 (even) and 1000 (odd):
    //   Y0 200: ((184 3000) >> 7) + 512 = 4312 + 512 = 4824
    //   Cb 100: ((-28 3000) >> 7) + 4096 = -657 + 4096 = 3439 (toward minus infinity)
    //   Y1 15:  ((-1 1000) >> 7) + 512 = -8 + 512 = 504
    //   Cr 255: ((127 3000) >> 7) + 4096 = 2976 + 4096 = 7072, by the even pixel's alpha
    // then a pair with alpha 0 (even) and 4096 (odd): 512, 4096, 32 (v - 16) + 512, 4096.
    {
        VRig<uint8_t> r(2, 4, 1);
        const uint8_t v[8] = {200, 100, 15, 255, 90, 30, 77, 250};
        std::copy(v, v + 8, r.colour.begin());
        const uint16_t a[4] = {3000, 1000, 0, 4096};
        std::copy(a, a + 4, r.alpha.begin());
        V_YUY2_STRAIGHT[line_above](r.c, r.s);
        const int16_t want[8] = {4824, 3439, 504, 7072, 512, 4096, 77 * 32, 4096};
        for (int e = 0; e < 8; ++e) EXPECT_EQ(r.c.line[e], want[e]) << "YUY2 element " << e;
        const int16_t wa[4] = {12000, 4000, 0, 16384};
        for (int x = 0; x < 4; ++x) EXPECT_EQ(r.c.line_a[x], wa[x]) << "YUY2 alpha " << x;
    }
    // 10 bits: Y0 800: (736 3000) >> 9 = 4312; Cb 400: (-112 3000) >> 9 = -657;
    // Y1 63: (-1 1000) >> 9 = -2; Cr 1023: (511 3000) >> 9 = 2994.
    {
        VRig<uint16_t> r(2, 2, 1);
        const uint16_t v[4] = {800, 400, 63, 1023};
        std::copy(v, v + 4, r.colour.begin());
        r.a(0, 0) = 3000;
        r.a(0, 1) = 1000;
        V_W210_STRAIGHT[line_above](r.c, r.s);
        const int16_t want[4] = {4824, 3439, 510, 7090};
        for (int e = 0; e < 4; ++e) EXPECT_EQ(r.c.line[e], want[e]) << "W210 element " << e;
    }
    // RGBQ has no offsets: (v a) >> 7, all four samples by the pixel's alpha.
    {
        VRig<uint8_t> r(4, 2, 1);
        const uint8_t v[8] = {200, 100, 15, 255, 1, 2, 3, 4};
        std::copy(v, v + 8, r.colour.begin());
        r.a(0, 0) = 3000;
        r.a(0, 1) = 0;
        V_RGBQ_STRAIGHT[line_above](r.c, r.s);
        const int16_t want[8] = {4687, 2343, 351, 5976, 0, 0, 0, 0};
        for (int e = 0; e < 8; ++e) EXPECT_EQ(r.c.line[e], want[e]) << "RGBQ element " << e;
        EXPECT_EQ(r.c.line_a[0], 12000);
        EXPECT_EQ(r.c.line_a[1], 0);
    }
}

// Alpha 0 gives black and neutral (no colour) and alpha 0, whatever the colour
// was, through every kernel of the tables.
TEST(AlphaPairings, StraightTablesWriteBlackUnderZeroAlpha)
{
    static int16_t bank[256];
    for (int ph = 0; ph < 16; ++ph)
        for (int k = 0; k < 16; ++k) bank[ph * 16 + k] = int16_t(k == 7 ? 20000 : k == 8 ? -3616 : 0);
    const int slots[] = {2, 3, 4, 5, 6, 7, 9};
    std::mt19937 rng(2);
    for (int slot : slots)
        for (int fmt = 0; fmt < 3; ++fmt) {
            const bool rgbq = fmt == 2, ten = fmt == 1;
            const auto& table = fmt == 0 ? lorvex::V_YUY2_STRAIGHT : ten ? lorvex::V_W210_STRAIGHT : lorvex::V_RGBQ_STRAIGHT;
            const int epp = rgbq ? 4 : 2;
            const auto check = [&](auto& r) {
                for (auto& v : r.colour) v = decltype(+v)(rng() % (ten ? 1024 : 256));
                r.c.vbank = bank;
                r.c.vphase = slot == 5 ? 0x8000 : 8;  // a 16-bit fraction, or a bank phase
                r.c.lines[0] = reinterpret_cast<const uint8_t*>(r.colour.data() + 4 * r.epl);
                r.c.lines2[0] = reinterpret_cast<const uint8_t*>(r.alpha.data() + 4 * r.px);
                r.c.box_first = 4000;
                r.c.box_step = 5000;
                r.c.box_mid = 2;
                r.c.box_last = 2384;
                table[size_t(slot)](r.c, r.s);
                for (int e = 0; e < 6 * epp; ++e)
                    EXPECT_EQ(r.c.line[e], rgbq ? 0 : e % 2 ? 4096 : 512) << "slot " << slot << " format " << fmt
                                                                          << " element " << e;
                for (int x = 0; x < 6; ++x) EXPECT_EQ(r.c.line_a[x], 0) << "slot " << slot << " alpha " << x;
            };
            if (ten) {
                VRig<uint16_t> r(epp, 6, 10);
                check(r);
            } else {
                VRig<uint8_t> r(epp, 6, 10);
                check(r);
            }
        }
}

// Filtering happens on premultiplied colour, alpha beside it with the same
// weights: colour saturate((sum w P) >> 14) + base, alpha (sum w a) >> 12.
// Linear at vphase 0x8000 (w = 8192) of Y 200 at alpha 4096 over Y 16 at
// alpha 0: (8192 5888 + 0) >> 14 = 2944, + 512 = 3456; alpha 8192. Box with
// weights 4000, 5000, 5000, 2384 over Y 120 at alphas 4096, 2048, 1024, 0:
// P = 3328, 1664, 832, 0: (13312000 + 8320000 + 4160000) >> 14 = 1574, + 512;
// alpha (16384000 + 10240000 + 5120000) >> 12 = 7750.
TEST(AlphaPairings, StraightTablesFilterPremultipliedColour)
{
    VRig<uint8_t> r(2, 2, 4);
    const int ys[4] = {200, 16, 0, 0};
    const uint16_t as[4] = {4096, 0, 0, 0};
    for (int l = 0; l < 4; ++l)
        for (int x = 0; x < 2; ++x) {
            r.at(l, 2 * x) = uint8_t(ys[l]);
            r.at(l, 2 * x + 1) = 128;
            r.a(l, x) = as[l];
        }
    r.c.vphase = 0x8000;
    lorvex::V_YUY2_STRAIGHT[lorvex::vslot::linear](r.c, r.s);
    EXPECT_EQ(r.c.line[0], 3456);
    EXPECT_EQ(r.c.line[1], 4096);
    EXPECT_EQ(r.c.line_a[0], 8192);

    const uint16_t bs[4] = {4096, 2048, 1024, 0};
    for (int l = 0; l < 4; ++l)
        for (int x = 0; x < 2; ++x) {
            r.at(l, 2 * x) = 120;
            r.a(l, x) = bs[l];
        }
    r.c.box_first = 4000;
    r.c.box_step = 5000;
    r.c.box_mid = 2;
    r.c.box_last = 2384;
    lorvex::V_YUY2_STRAIGHT[lorvex::vslot::box](r.c, r.s);
    EXPECT_EQ(r.c.line[0], 1574 + 512);
    EXPECT_EQ(r.c.line[2], 1574 + 512);
    EXPECT_EQ(r.c.line_a[0], 7750);
    EXPECT_EQ(r.c.line_a[1], 7750);
}

// The pad kernels repeat alpha with the colour: on the left over `pad_left`
// pixels, on the right over `pad_right` rounded up to even in 4:2:2 and
// exactly in RGBQ.
TEST(AlphaPairings, StraightPadsRepeatAlpha)
{
    for (bool rgbq : {false, true}) {
        VRig<uint8_t> r(rgbq ? 4 : 2, 4, 1);
        for (auto& v : r.colour) v = 100;
        const uint16_t a[4] = {1000, 2000, 3000, 4000};
        std::copy(a, a + 4, r.alpha.begin());
        r.s.pad_left = 2;
        r.s.last = 5;
        r.s.pad_right = 3;
        const auto& table = rgbq ? lorvex::V_RGBQ_STRAIGHT : lorvex::V_YUY2_STRAIGHT;
        table[lorvex::vslot::line_above](r.c, r.s);
        table[lorvex::vslot::pad_left](r.c, r.s);
        table[lorvex::vslot::pad_right](r.c, r.s);
        const int filled = rgbq ? 3 : 4;
        EXPECT_EQ(r.c.line_a[0], 4000);
        EXPECT_EQ(r.c.line_a[1], 4000);
        for (int i = 1; i <= filled; ++i) EXPECT_EQ(r.c.line_a[5 + i], 16000) << (rgbq ? "RGBQ" : "YUY2") << " +" << i;
        EXPECT_EQ(r.c.line_a[6 + filled], -1) << (rgbq ? "RGBQ" : "YUY2") << ": one alpha too many";
    }
}

}  // namespace
