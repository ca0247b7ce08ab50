// map_rectangle with alpha planes, end to end: which pairings draw and which
// are refused, what each pairing does to a constant picture, the asymmetric
// reading of alpha_mode, straight sources against their premultiplied twins,
// and the second plane through fields, line phases and strips; last, the
// straight vertical tables by their kernels. Destinations are compared byte
// for byte, both planes with their padding and guard bytes.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "lorvex.h"
#include "shared/map_context.h"
#include "vertical/straight_kernels.h"

namespace {

constexpr size_t kGuard = 64;
std::mt19937 unused_rng;  // for fills that draw no random value

// An image with an optional "w12b" plane, each plane inside guard bytes. A
// 4:2:2 pixel x has luma at element 2x and its pair's Cb and Cr at 2(x & ~1)
// + 1 and + 3; RGBQ pixel x has 4x .. 4x + 3. FORMAT_ALPHA has no colour plane.
struct Image {
    uint8_t format;
    int w, h, epp = 0, esize = 1, elems = 0, stride = 0, astride = 0;
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
            epp = fmt == FORMAT_RGBQ ? 4 : 2;
            esize = fmt == FORMAT_W210 ? 2 : 1;
            elems = (epp == 2 ? (w + 1) & ~1 : w) * epp;
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

    int max() const { return format == FORMAT_W210 ? 1023 : 255; }
    int off(int k) const { return format == FORMAT_RGBQ || k == 3 ? 0 : (k ? 128 : 16) << (esize == 2 ? 2 : 0); }
    static int rd(const std::vector<uint8_t>& m, size_t i, int n) { return n == 1 ? m[i] : m[i] | m[i + 1] << 8; }
    static void wr(std::vector<uint8_t>& m, size_t i, int n, int v)
    {
        m[i] = uint8_t(v);
        if (n == 2) m[i + 1] = uint8_t(v >> 8);
    }
    size_t at(int e, int y) const { return kGuard + size_t(y * stride + e * esize); }
    size_t aat(int x, int y) const { return kGuard + size_t(y * astride + 2 * x); }
    int get(int e, int y) const { return rd(mem, at(e, y), esize); }
    void set(int e, int y, int v) { wr(mem, at(e, y), esize, v); }
    int alpha(int x, int y) const { return rd(amem, aat(x, y), 2); }
    void set_alpha(int x, int y, int v) { wr(amem, aat(x, y), 2, v); }
    // 0 luma (RGBQ sample 0), 1 Cb, 2 Cr, 3 RGBQ sample 3.
    int kind(int e) const { return epp == 4 ? e % 4 : e % 2 == 0 ? 0 : e % 4 == 1 ? 1 : 2; }
    // Colour by kind (v null: random) and alpha words (a < 0: random).
    void fill(const int* v, int a, std::mt19937& rng = unused_rng)
    {
        for (int y = 0; y < h; ++y) {
            for (int e = 0; e < elems; ++e) set(e, y, v ? v[kind(e)] : int(rng() % uint32_t(max() + 1)));
            for (int x = 0; x < w && !amem.empty(); ++x) set_alpha(x, y, a >= 0 ? a : int(rng() % 4097));
        }
    }
    void randomise(std::mt19937& rng) { fill(nullptr, -1, rng); }
    void fill_alpha(int a)
    {
        for (int y = 0; y < h; ++y)
            for (int x = 0; x < w; ++x) set_alpha(x, y, a);
    }
    void copy_from(const Image& o)
    {
        mem = o.mem;
        amem = o.amem;
    }
};

::testing::AssertionResult same(const Image& want, const Image& got)
{
    for (auto m : {&Image::mem, &Image::amem}) {
        const auto& w = want.*m;
        const auto& g = got.*m;
        for (size_t i = 0; i < w.size(); ++i)
            if (w[i] != g[i])
                return ::testing::AssertionFailure() << (m == &Image::mem ? "colour" : "alpha") << " byte "
                                                     << int(i) - int(kGuard) << ": expected " << int(w[i]) << ", got "
                                                     << int(g[i]);
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

enum SrcAlpha { kNone, kStraight, kPremultiplied };
uint8_t mode_of(SrcAlpha sa) { return sa == kStraight ? ALPHA_MODE_STRAIGHT : ALPHA_MODE_PREMULTIPLIED; }
struct Pairing {
    uint8_t sf;
    SrcAlpha sa;
    uint8_t df;
    bool da;
};
std::string name(const Pairing& p, int dmode)
{
    const char* f[] = {"ALPHA", "RGBQ", "YUY2", "", "", "", "W210"};
    const char* a[] = {"no alpha", "straight", "premultiplied"};
    return std::string(f[p.sf]) + " (" + a[p.sa] + ") into " + f[p.df] +
           (p.da ? dmode == 2 ? " with premultiplied alpha" : " with straight alpha" : "");
}

// ---- what a pairing draws ----------------------------------------------------

// The pixel a 1:1 area copy of a constant source makes on a constant
// destination (whole pixels, level 4096, overlay). Into the line buffer:
// without alpha or premultiplied v << 5 (<< 3); straight ((v - o) a) >> 7 (>> 9)
// plus black 512 or neutral 4096 (RGBQ 0). Out: S = (B + 16) >> 5 or (B + 4) >> 3
// (limited when 10 bits go to 8, a row with clamp). Then:
//   _DA or no alpha       D = S, Dα = 4096
//   _SA fast (straight)   (B + (((D - o) m) >> 9) + 16) >> 5, m = 16384 - 4a; luma unclamped
//   _SA general           clamp((((D - o)(16384 - 4a) + 8192) >> 14) + S)
//   _SA_DA premultiplied  Dα' = ((Dα (4096 - a) + 2048) >> 12) + a, clamp((((D - o)(4096 - a) + 2048) >> 12) + S)
//   _SA_DA straight       d = ((4096 - a) Dα + 2048) >> 12, t = a + d: clamp(((D - o) d + ((S - o) << 12)) / t + o)
//   alpha only            Dα' = (((4096 - a) Dα + 2048) >> 12) + a
// The first and last pixel of a 1:1 area copy are constant regions, which
// read the buffer by truncation (`edge`) and take the general rules.
void expected_pixel(const Pairing& p, int dmode, const int (&v)[4], int a, bool edge, int (&d)[4], int& da)
{
    if (p.sf == FORMAT_ALPHA) {
        da = (((4096 - a) * da + 2048) >> 12) + a;
        return;
    }
    const Image si(p.sf, 1, 1, false), di(p.df, 1, 1, false);
    const int n = p.sf == FORMAT_RGBQ ? 4 : 3, in = p.sf == FORMAT_W210 ? 3 : 5, out = p.df == FORMAT_W210 ? 3 : 5;
    const bool narrowed = p.sf == FORMAT_W210 && p.df == FORMAT_YUY2;
    const auto lim = [&](int64_t x) { return int(std::clamp<int64_t>(x, 0, di.max())); };
    int64_t B[4], S[4];
    for (int k = 0; k < n; ++k) {
        const int base = p.sf == FORMAT_RGBQ ? 0 : k ? 4096 : 512;
        B[k] = p.sa == kStraight ? ((int64_t(v[k] - si.off(k)) * a) >> (12 - in)) + base : int64_t(v[k]) << in;
        S[k] = (B[k] + (edge ? 0 : 1 << (out - 1))) >> out;
        if (narrowed) S[k] = lim(S[k]);
    }
    for (int k = 0; k < n; ++k) {
        const int64_t D = d[k], o = di.off(k);
        if (p.sa == kNone) {
            d[k] = int(S[k]);
        } else if (!p.da && p.sa == kStraight && !narrowed && !edge) {
            const int64_t r = (B[k] + (((D - o) * (16384 - 4 * a)) >> (14 - out)) + (1 << (out - 1))) >> out;
            d[k] = n == 3 && k ? lim(r) : int(r);
        } else if (!p.da) {
            d[k] = lim((((D - o) * (16384 - 4 * a) + 8192) >> 14) + S[k]);
        } else if (dmode == 2) {
            d[k] = lim((((D - o) * (4096 - a) + 2048) >> 12) + S[k]);
        } else {
            const int64_t dd = ((4096 - a) * int64_t(da) + 2048) >> 12;
            d[k] = lim(((D - o) * dd + ((S[k] - o) << 12)) / (a + dd) + o);
        }
    }
    if (p.sa == kNone)
        da = 4096;
    else if (dmode == 2)
        da = ((da * (4096 - a) + 2048) >> 12) + a;
    else
        da = a + (((4096 - a) * da + 2048) >> 12);
}

// Source and destination colours, alike in buffer units across depths.
void colours(uint8_t f, int (&src)[4], int (&dst)[4])
{
    const int s8[4] = {200, 100, 180, f == FORMAT_RGBQ ? 60 : 0}, d8[4] = {50, 150, 60, 0};
    const int dr[4] = {10, 20, 30, 40}, dw[4] = {200, 600, 240, 0};
    for (int k = 0; k < 4; ++k) {
        src[k] = f == FORMAT_W210 ? 4 * s8[k] : s8[k];
        dst[k] = f == FORMAT_W210 ? dw[k] : f == FORMAT_RGBQ ? dr[k] : d8[k];
    }
}

// A 1:1 area copy of a constant 6x3 source over a constant destination.
void check_pairing(const Pairing& p, int a, int dmode, int src_mode = -1)
{
    constexpr int W = 6, H = 3;
    int sv[4], dv[4], unused[4];
    colours(p.sf, sv, unused);
    colours(p.df, unused, dv);
    Image src(p.sf, W, H, p.sa != kNone, src_mode >= 0 ? uint8_t(src_mode) : mode_of(p.sa));
    Image dst(p.df, W, H, p.da, uint8_t(dmode)), want(p.df, W, H, p.da, uint8_t(dmode));
    src.fill(sv, a);
    dst.fill(dv, 1024);
    want.copy_from(dst);
    int mid[4] = {dv[0], dv[1], dv[2], dv[3]}, edge[4] = {dv[0], dv[1], dv[2], dv[3]}, da = 1024, eda = 1024;
    expected_pixel(p, dmode, sv, a, false, mid, da);
    expected_pixel(p, dmode, sv, a, true, edge, eda);
    ASSERT_EQ(da, eda);
    want.fill(mid, da);
    // Pixel 0 with its pair's chroma, and the luma of the last (odd) pixel.
    for (int y = 0; y < H; ++y)
        for (int e = 0; e < want.elems; ++e) {
            const int x = e / want.epp, k = want.kind(e), owner = want.epp == 2 && k ? x & ~1 : x;
            if (owner == 0 || (x == W - 1 && (want.epp == 4 || k == 0))) want.set(e, y, edge[k]);
        }
    draw(dst, whole(dst), src, whole(src), 0);
    EXPECT_TRUE(same(want, dst)) << name(p, dmode) << ", source alpha " << a << ", mode " << src_mode;
}

// The 24 rows of the pairing table, premultiplied sources written out (31).
TEST(AlphaPairings, EveryRowDrawsItsComposition)
{
    std::vector<Pairing> all{{FORMAT_ALPHA, kPremultiplied, FORMAT_ALPHA, true}};
    for (SrcAlpha sa : {kNone, kStraight, kPremultiplied})
        for (bool da : {false, true}) {
            all.push_back({FORMAT_RGBQ, sa, FORMAT_RGBQ, da});
            for (uint8_t sf : {FORMAT_YUY2, FORMAT_W210})
                for (uint8_t df : {FORMAT_YUY2, FORMAT_W210}) all.push_back({sf, sa, df, da});
        }
    for (const Pairing& p : all)
        for (int dmode : {1, 2})
            for (int a : {4096, 2048, 1000})
                if (p.da || dmode == 1) check_pairing(p, a, dmode);
}

// A source counts as straight only at alpha_mode 1; a destination counts as
// premultiplied only at 2. The two readings differ here, so each value shows
// which was taken. An alpha-only image has no colour: every mode draws alike.
TEST(AlphaPairings, AlphaModeIsReadAsymmetrically)
{
    for (uint8_t f : {FORMAT_YUY2, FORMAT_W210, FORMAT_RGBQ})
        for (int mode : {0, 3, 255}) {
            for (bool da : {false, true}) check_pairing({f, kPremultiplied, f, da}, 2048, 1, mode);
            int sv[4], dv[4];
            colours(f, sv, dv);
            Image src(f, 4, 2, true, ALPHA_MODE_STRAIGHT), got(f, 4, 2, true, uint8_t(mode)),
                as_straight(f, 4, 2, true, ALPHA_MODE_STRAIGHT), as_pre(f, 4, 2, true, ALPHA_MODE_PREMULTIPLIED);
            src.fill(sv, 2048);
            for (Image* d : {&got, &as_straight, &as_pre}) {
                d->fill(dv, 1024);
                draw(*d, whole(*d), src, whole(src), 0);
            }
            EXPECT_TRUE(same(as_straight, got)) << "destination alpha_mode " << mode;
            EXPECT_FALSE(same(as_pre, got)) << "destination alpha_mode " << mode;
        }
    for (int mode : {0, 1, 2, 3}) check_pairing({FORMAT_ALPHA, kPremultiplied, FORMAT_ALPHA, true}, 2048, 1, mode);
}

// Combinations outside the table return before anything is written, in
// either plane; the same call with the alpha formats corrected draws.
TEST(AlphaPairings, RefusedCombinationsLeaveTheDestinationAlone)
{
    struct Refused {
        uint8_t sf, s_alpha_format, s_mode, df, d_alpha_format;
        uint32_t flags;
    };
    const uint32_t edge = lorvex_flag_filters(1, 7);  // kind 7 magnifies: 5 lines into 10
    const Refused cases[] = {
        {FORMAT_YUY2, 1, 2, FORMAT_YUY2, 0, 0},         {FORMAT_YUY2, 2, 1, FORMAT_YUY2, 3, 0},
        {FORMAT_RGBQ, 4, 2, FORMAT_RGBQ, 0, 0},         {FORMAT_YUY2, 0, 2, FORMAT_YUY2, 1, 0},
        {FORMAT_W210, 3, 1, FORMAT_W210, 2, 0},         {FORMAT_RGBQ, 3, 2, FORMAT_RGBQ, 2, 0},
        {FORMAT_RGBQ, 0, 2, FORMAT_YUY2, 0, 0},         {FORMAT_RGBQ, 3, 1, FORMAT_W210, 3, 0},
        {FORMAT_YUY2, 0, 2, FORMAT_RGBQ, 0, 0},         {FORMAT_W210, 3, 2, FORMAT_RGBQ, 3, 0},
        {FORMAT_ALPHA, 0, 2, FORMAT_ALPHA, 3, 0},       {FORMAT_ALPHA, 3, 2, FORMAT_ALPHA, 0, 0},
        {FORMAT_ALPHA, 3, 2, FORMAT_YUY2, 3, 0},        {FORMAT_YUY2, 3, 2, FORMAT_ALPHA, 3, 0},
        {FORMAT_RGBQ, 3, 2, FORMAT_ALPHA, 3, 0},        {FORMAT_WORD, 0, 2, FORMAT_YUY2, 0, 0},
        {FORMAT_YUVQ, 0, 2, FORMAT_YUY2, 3, 0},         {FORMAT_YUY2, 0, 2, 4, 0, 0},
        {FORMAT_RGBQ, 0, 2, FORMAT_WIDE_ALPHA, 0, 0},   {FORMAT_YUY2, 3, 2, FORMAT_YUY2, 0, edge},
        {FORMAT_RGBQ, 3, 0, FORMAT_RGBQ, 3, edge},      {FORMAT_YUY2, 3, 1, FORMAT_YUY2, 3, edge},
    };
    std::mt19937 rng(11);
    // Planes laid out as the nearest format the test knows.
    const auto layout = [](uint8_t f) {
        return f == FORMAT_ALPHA || f == FORMAT_W210 || f == FORMAT_RGBQ ? f : uint8_t(FORMAT_YUY2);
    };
    for (const Refused& r : cases) {
        SCOPED_TRACE(::testing::Message() << "case " << &r - cases);
        Image src(layout(r.sf), 8, 5, true, r.s_mode), dst(layout(r.df), 8, 10, true, 1),
            want(layout(r.df), 8, 10, true, 1);
        src.s.format = r.sf;
        src.s.alpha_format = r.s_alpha_format;
        dst.s.format = r.df;
        dst.s.alpha_format = r.d_alpha_format;
        src.randomise(rng);
        dst.randomise(rng);
        want.copy_from(dst);
        draw(dst, whole(dst), src, whole(src), r.flags);
        EXPECT_TRUE(same(want, dst));
        if (r.flags || r.sf != r.df || layout(r.sf) != r.sf) continue;
        dst.s.alpha_format = src.s.alpha_format = ALPHA_W12B;
        draw(dst, whole(dst), src, whole(src), 0);
        EXPECT_FALSE(same(want, dst)) << "corrected";
    }
}

// The rows marked with clamp: 10-bit 1023 (8184 units, (8184 + 16) >> 5 = 256)
// is limited to 255 for 8 bits in every family; and a premultiplied source
// takes the general form of _SA. 2.5 pixels of 255 at alpha 1024 over 250:
// pixel 2 (c14 8192, e 2048) ((234 14336 + 239 8192 + 8192) >> 14) + 16 = 340,
// clamped, where the fast form would store 84; RGBQ 346, clamped.
TEST(AlphaPairings, ClampedRowsLimitTheirSamples)
{
    for (SrcAlpha sa : {kNone, kStraight, kPremultiplied})
        for (bool da : {false, true}) {
            SCOPED_TRACE(name({FORMAT_W210, sa, FORMAT_YUY2, da}, 1));
            Image src(FORMAT_W210, 4, 2, sa != kNone, mode_of(sa)), dst(FORMAT_YUY2, 4, 2, da, 1);
            const int white[4] = {1023, 512, 512, 0}, black[4] = {16, 128, 128, 0};
            src.fill(white, 4096);
            dst.fill(black, 0);
            draw(dst, whole(dst), src, whole(src), 0);
            for (int x = 0; x < 4; ++x) EXPECT_EQ(dst.get(2 * x, 1), 255) << "pixel " << x;
        }
    for (uint8_t f : {FORMAT_YUY2, FORMAT_RGBQ}) {
        Image src(f, 4, 1, true, ALPHA_MODE_PREMULTIPLIED), dst(f, 4, 1, false);
        const int full[4] = {255, 255, 255, 255}, under[4] = {250, 250, 250, 250};
        src.fill(full, 1024);
        dst.fill(under, 0);
        draw(dst, {0, 0, 2.5f, 1}, src, {0, 0, 2.5f, 1}, 0);
        EXPECT_EQ(dst.get(f == FORMAT_RGBQ ? 8 : 4, 0), 255) << int(f);
    }
}

// ---- straight sources and their premultiplied twins --------------------------
//
// A straight source keeps 1/32 (1/8) of a step of its premultiplied colour; its
// twin holds that colour rounded down to steps and runs with clamp set (the
// general form of _SA). They give the same picture where the buffers are equal
// and the forms agree: alpha 4096 or 0 everywhere, black and neutral at any
// alpha, and (v - o) a / 4096 whole steps on a 1:1 copy; into destinations with
// alpha for any filter, without alpha for filters with negative lobes or on
// whole pixels of whole steps. (Where the straight source keeps a fraction,
// the pairings above show it.)
TEST(AlphaPairings, StraightAndPremultipliedTwins)
{
    struct Mapping {
        Rect dst, src;
        uint32_t flags;
        bool whole, on_grid, lobes;  // every pixel whole; ... and of whole steps; negative lobes
    };
    const Mapping maps[] = {
        {{0, 0, 12, 6}, {0, 0, 12, 6}, 0, true, true, false},
        {{0, 0, 6, 3}, {0, 0, 12, 6}, 0, true, false, false},
        {{0.5f, 0.25f, 10.75f, 5.5f}, {0, 0, 12, 6}, 0, false, false, false},
        {{0, 0, 12, 6}, {1, 0.5f, 8, 5}, lorvex_flag_filters(1, 1), true, false, false},
        {{0.25f, 0.5f, 11.5f, 5.75f}, {0.3f, 0.2f, 9.1f, 5.3f}, lorvex_flag_filters(2, 2), false, false, true},
        {{0, 0, 8, 4}, {0, 0, 12, 6}, lorvex_flag_filters(5, 5), true, false, true},
        {{0.5f, 0.5f, 11.5f, 5.5f}, {0, 0, 12, 6}, lorvex_flag_filters(2, 2) | LORVEX_TILE, false, false, true},
    };
    std::mt19937 rng(5);
    for (uint8_t sf : {FORMAT_YUY2, FORMAT_W210, FORMAT_RGBQ})
        for (int picture = 0; picture < 4; ++picture) {
            // 0: alpha 4096; 1: alpha 0; 2: black and neutral, any alpha; 3: (v - o) even, alpha 2048.
            Image straight(sf, 12, 6, true, ALPHA_MODE_STRAIGHT), twin(sf, 12, 6, true, ALPHA_MODE_PREMULTIPLIED);
            straight.randomise(rng);
            if (picture != 2) straight.fill_alpha(picture == 0 ? 4096 : picture == 1 ? 0 : 2048);
            twin.copy_from(straight);
            for (int y = 0; y < 6; ++y)
                for (int e = 0; e < straight.elems; ++e) {
                    const int k = straight.kind(e), x = e / straight.epp, o = straight.off(k);
                    const int owner = straight.epp == 2 && k ? x & ~1 : x;  // a pair's chroma: the even pixel
                    if (picture >= 2) straight.set(e, y, picture == 2 ? o : straight.get(e, y) & ~1);
                    const int64_t p = int64_t(straight.get(e, y) - o) * straight.alpha(owner, y);
                    twin.set(e, y, int((p >= 0 ? p / 4096 : -((-p + 4095) / 4096)) + o));
                }
            for (uint8_t df : sf == FORMAT_RGBQ ? std::vector<uint8_t>{FORMAT_RGBQ}
                                                : std::vector<uint8_t>{FORMAT_YUY2, FORMAT_W210})
                for (const Mapping& m : maps) {
                    if (picture == 3 && !m.on_grid) continue;
                    for (int dmode : {0, 1, 2}) {
                        const bool da = dmode != 0;
                        if (!da && !(m.lobes || picture == 1 || m.on_grid || (picture == 2 && m.whole))) continue;
                        Image a(df, 12, 6, da, uint8_t(dmode)), b(df, 12, 6, da, uint8_t(dmode));
                        a.randomise(rng);
                        b.copy_from(a);
                        draw(a, m.dst, straight, m.src, m.flags);
                        draw(b, m.dst, twin, m.src, m.flags);
                        EXPECT_TRUE(same(a, b)) << int(sf) << " picture " << picture << " into " << int(df)
                                                << ", destination mode " << dmode << ", flags " << m.flags;
                    }
                }
        }
}

// In tile mode the partly covered pixels of a _DA destination add their
// coverage to the alpha word without a limit (4000 + 2048 twice), a whole
// pixel belongs to the tile alone (4096); an alpha-only destination adds as
// 16-bit words: 65000 + 2048 wraps to 1512, and a whole pixel takes A.
TEST(AlphaPairings, TiledDestinationAlphaIsNeverClamped)
{
    Image src(FORMAT_YUY2, 4, 1, false), dst(FORMAT_YUY2, 6, 1, true, ALPHA_MODE_PREMULTIPLIED);
    const int black[4] = {16, 128, 128, 0};
    src.fill(black, 0);
    dst.fill(black, 4000);
    for (int want : {6048, 8096}) {
        draw(dst, {0.5f, 0, 4.5f, 1}, src, whole(src), LORVEX_TILE);
        EXPECT_EQ(dst.alpha(0, 0), want);
        EXPECT_EQ(dst.alpha(4, 0), want);
    }
    EXPECT_EQ(dst.alpha(2, 0), 4096);
    EXPECT_EQ(dst.alpha(5, 0), 4000);

    Image asrc(FORMAT_ALPHA, 4, 1, true), adst(FORMAT_ALPHA, 6, 1, true);
    asrc.fill_alpha(4096);
    adst.fill_alpha(65000);
    draw(adst, {0.5f, 0, 4.5f, 1}, asrc, whole(asrc), LORVEX_TILE);
    EXPECT_EQ(adst.alpha(0, 0), 1512);
    EXPECT_EQ(adst.alpha(1, 0), 4096);
    EXPECT_EQ(adst.alpha(4, 0), 1512);
}

// ---- the second plane through fields, line phases and strips -------------------

// A destination field is what the call without the field flag draws into a
// view of the field's lines, the source moved by a quarter of a field line's
// step; a source field reads the field's lines of both planes. Calls that
// split the lines by phase draw what one call draws; so do calls of one strip
// each along a line of many strips (linear 1:1 has no constant regions).
TEST(AlphaPairings, SecondPlaneThroughFieldsPhasesAndStrips)
{
    std::mt19937 rng(21);
    const auto field = [](const Image& i, bool odd) {
        Surface v = i.s;
        v.height = odd ? i.h / 2 : (i.h + 1) / 2;
        if (odd && v.data) v.data = static_cast<uint8_t*>(v.data) + v.stride;
        if (odd && v.alpha_data) v.alpha_data = static_cast<uint8_t*>(v.alpha_data) + v.alpha_stride;
        v.stride *= 2;
        v.alpha_stride *= 2;
        return v;
    };
    const uint32_t linear = lorvex_flag_filters(1, 1);
    for (const Pairing& p : {Pairing{FORMAT_YUY2, kStraight, FORMAT_YUY2, true},
                             Pairing{FORMAT_W210, kPremultiplied, FORMAT_YUY2, true},
                             Pairing{FORMAT_RGBQ, kStraight, FORMAT_RGBQ, true},
                             Pairing{FORMAT_W210, kStraight, FORMAT_W210, false},
                             Pairing{FORMAT_ALPHA, kPremultiplied, FORMAT_ALPHA, true}}) {
        SCOPED_TRACE(name(p, 2));
        Image src(p.sf, 8, 8, true, mode_of(p.sa));
        src.randomise(rng);
        for (bool odd : {false, true}) {
            Image got(p.df, 8, 8, p.da, 2), want(p.df, 8, 8, p.da, 2), got2(p.df, 8, 4, p.da, 2),
                want2(p.df, 8, 4, p.da, 2);
            got.randomise(rng);
            got2.randomise(rng);
            want.copy_from(got);
            want2.copy_from(got2);
            draw(got, whole(got), src, whole(src), linear | (odd ? LORVEX_DEST_ODD_FIELD : LORVEX_DEST_EVEN_FIELD));
            draw(got2, whole(got2), src, whole(src),
                 linear | (odd ? LORVEX_SOURCE_ODD_FIELD : LORVEX_SOURCE_EVEN_FIELD));
            Surface view = field(want, odd);
            const Surface sview = field(src, odd);
            const float o = odd ? 0.5f : -0.5f, so = odd ? -0.25f : 0.25f;
            map_rectangle(&view, 0, 0, 8, 4, &src.s, 0, o, 8, 8 + o, int32_t(linear), 0, 1);
            map_rectangle(&want2.s, 0, 0, 8, 4, &sview, 0, so, 8, 4 + so, int32_t(linear), 0, 1);
            EXPECT_TRUE(same(want, got)) << "destination field, odd " << odd;
            EXPECT_TRUE(same(want2, got2)) << "source field, odd " << odd;
        }
        Image all(p.df, 12, 9, p.da, 1), split(p.df, 12, 9, p.da, 1);
        all.randomise(rng);
        split.copy_from(all);
        for (int phase = 0; phase < 4; ++phase)  // phases 0 to 2 of 3, then one call
            map_rectangle(&(phase < 3 ? split : all).s, 0.5f, 0.25f, 11.5f, 8.5f, &src.s, 0, 0, 8, 7,
                          int32_t(lorvex_flag_filters(2, 2)), phase % 3, phase < 3 ? 3 : 1);
        EXPECT_TRUE(same(all, split)) << "line phases";

        constexpr int W = 12000, piece = 1000;
        Image wide(p.sf, W, 2, true, mode_of(p.sa)), one(p.df, W, 2, p.da, 1), pieces(p.df, W, 2, p.da, 1);
        wide.randomise(rng);
        if (p.sa == kStraight) wide.fill_alpha(4096);  // on the stored grid: the pieces' edges do not truncate
        one.randomise(rng);
        pieces.copy_from(one);
        draw(one, whole(one), wide, whole(wide), linear);
        for (int x = 0; x < W; x += piece)
            draw(pieces, {float(x), 0, float(x + piece), 2}, wide, {float(x), 0, float(x + piece), 2}, linear);
        EXPECT_TRUE(same(pieces, one)) << "one call of several strips";
    }
}

// ---- the straight vertical tables ----------------------------------------------

// A straight source is premultiplied on its way into the line buffer:
// ((v - o) a) >> 7 (>> 9) + 512 or 4096, rounding toward minus infinity, a
// pair's chroma by its even pixel's alpha; RGBQ (v a) >> 7 on all four; alpha
// in 1/16384. 8 bits: Y0 200 at 3000 ((184 3000) >> 7) + 512 = 4824, Cb 100
// -657 + 4096 = 3439, Y1 15 at 1000 -8 + 512 = 504, Cr 255 2976 + 4096 = 7072;
// alpha 0 gives black and neutral, 4096 32 (v - 16) + 512. 10 bits: Y1 63
// (-1 1000) >> 9 = -2, Cr 1023 (511 3000) >> 9 = 2994. (Filters, pads and
// alpha 0 through every kernel show in the twins above.)
TEST(AlphaPairings, StraightTablesPremultiplyOnTheWayIn)
{
    const auto run = [](const lorvex::VerticalKernelTable& t, auto v, std::vector<uint16_t> a) {
        std::vector<int16_t> line(v.size() + 1, -1), line_a(a.size() + 1, -1);
        lorvex::MapContext c;
        c.line = line.data();
        c.line_a = line_a.data();
        c.lines[0] = reinterpret_cast<const uint8_t*>(v.data());
        c.lines2[0] = reinterpret_cast<const uint8_t*>(a.data());
        lorvex::StripRecord s{};
        s.src_end = int32_t(a.size());
        t[lorvex::vslot::line_above](c, s);
        line.insert(line.end(), line_a.begin(), line_a.end());
        return line;
    };
    EXPECT_EQ(run(lorvex::V_YUY2_STRAIGHT, std::vector<uint8_t>{200, 100, 15, 255, 90, 30, 77, 250},
                  {3000, 1000, 0, 4096}),
              (std::vector<int16_t>{4824, 3439, 504, 7072, 512, 4096, 77 * 32, 4096, -1, 12000, 4000, 0, 16384, -1}));
    EXPECT_EQ(run(lorvex::V_W210_STRAIGHT, std::vector<uint16_t>{800, 400, 63, 1023}, {3000, 1000}),
              (std::vector<int16_t>{4824, 3439, 510, 7090, -1, 12000, 4000, -1}));
    EXPECT_EQ(run(lorvex::V_RGBQ_STRAIGHT, std::vector<uint8_t>{200, 100, 15, 255, 1, 2, 3, 4}, {3000, 0}),
              (std::vector<int16_t>{4687, 2343, 351, 5976, 0, 0, 0, 0, -1, 12000, 0, -1}));
}

}  // namespace
