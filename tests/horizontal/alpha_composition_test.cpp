// Composition of the horizontal tables with alpha: the _DA family (source
// without alpha into a destination alpha plane), _SA (source alpha into a
// destination without, general form and the fast form in buffer units),
// _SA_DA (both sides) and the alpha-only table, for YUY2, W210 and RGBQ.
//
// Every filter reproduces a constant, so on a constant line buffer each main
// kernel hands its family the same S (and A) at every pixel, and each
// destination value follows from the family's rule written out below. The
// sweeps run every rule row over whole pixels, partly covered pixels and
// lines, an odd single pixel, tile and overlay, both destination
// associations, five levels (1000 to a gain of 6000), source alphas from 0
// to an overshoot above 1.0 and the slots where a family changes behaviour;
// the named tests pin hand-worked values, the constant regions (slots 0 and
// 1) and the cases where a wrong unit, a rounding term or a clamp would show.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <sstream>
#include <string>
#include <vector>

#include "horizontal/horizontal_kernels.h"
#include "shared/map_context.h"

namespace lorvex {
namespace {

enum class Family { DA, SA, SA_DA, ALPHA };

const char* family_name(Family f)
{
    switch (f) {
    case Family::DA: return "_DA";
    case Family::SA: return "_SA";
    case Family::SA_DA: return "_SA_DA";
    case Family::ALPHA: return "H_ALPHA";
    }
    return "?";
}

// A destination layout: its tables, stored depth and offsets.
struct Fmt {
    const char* name;
    const HorizontalKernelTable* da;
    const HorizontalKernelTable* sa;
    const HorizontalKernelTable* sa_da;
    int bytes;  // per stored sample
    bool pairs;
    int max, yo, co;
    int sh;  // a stored sample is sample << sh buffer units
    const HorizontalKernelTable& table(Family f) const
    {
        return f == Family::DA ? *da : f == Family::SA ? *sa : f == Family::SA_DA ? *sa_da : H_ALPHA;
    }
};
const Fmt kYuy2{"YUY2", &H_YUY2_DA, &H_YUY2_SA, &H_YUY2_SA_DA, 1, true, 255, 16, 128, 5};
const Fmt kW210{"W210", &H_W210_DA, &H_W210_SA, &H_W210_SA_DA, 2, true, 1023, 64, 512, 3};
const Fmt kRgbq{"RGBQ", &H_RGBQ_DA, &H_RGBQ_SA, &H_RGBQ_SA_DA, 1, false, 255, 0, 0, 5};
const Fmt kAlphaOnly{"ALPHA", nullptr, nullptr, nullptr, 2, false, 65535, 0, 0, 2};
const Fmt* const kColourFmts[] = {&kYuy2, &kW210, &kRgbq};

// A bank whose every phase keeps a constant: two taps summing to 16384 and
// zeros elsewhere, so that kernels of any width read the same value.
struct ConstantBank {
    std::array<int16_t, 256> rows{};
    ConstantBank()
    {
        for (int ph = 0; ph < 16; ++ph) {
            rows[size_t(ph * 16 + 7)] = 6000;
            rows[size_t(ph * 16 + 8)] = 10384;
        }
    }
};
const ConstantBank kBank;

int32_t c14(int32_t hc, int32_t vcover, int32_t level)
{
    return int32_t((((int64_t(hc) * vcover + 32767) >> 16) * level + 2048) >> 12);
}
int32_t c12(int32_t hc, int32_t vcover, int32_t level)
{
    return int32_t((((int64_t(hc) * vcover + 0x1ffff) >> 18) * level + 2048) >> 12);
}

constexpr int kPixels = 12;

// One destination line (colour plane and alpha plane) and a line buffer.
// Samples of the colour plane are addressed by element: a 4:2:2 pixel x has
// luma at 2x and its pair's Cb and Cr at 2(x & ~1) + 1 and + 3; RGBQ pixel x
// has 4x .. 4x + 3. Pixel 0 is the even pixel of a pair by its address.
struct Rig {
    const Fmt& f;
    alignas(64) std::array<uint8_t, kPixels * 4 + 64> dst{};
    std::array<uint16_t, kPixels + 8> dalpha{};
    std::vector<int16_t> colour = std::vector<int16_t>(512, 0);
    std::vector<int16_t> alpha = std::vector<int16_t>(256, 0);
    MapContext c;
    StripRecord s{};

    explicit Rig(const Fmt& fmt) : f(fmt)
    {
        c.line = colour.data() + 128;
        c.line_a = alpha.data() + 64;
        c.dst_line = dst.data();
        c.dst_line2 = reinterpret_cast<uint8_t*>(dalpha.data());
        c.hbank_y = kBank.rows.data();
        c.hbank_c = kBank.rows.data();
        c.hstep = 0x10000;
        c.vcover = 16384;
        c.level = 4096;
        std::fill(dst.begin(), dst.end(), uint8_t(0x5A));
        std::fill(dalpha.begin(), dalpha.end(), uint16_t(0x5A5A));
    }
    int elems() const { return f.pairs ? 2 * kPixels : 4 * kPixels; }
    int get(int e) const
    {
        return f.bytes == 1 ? dst[size_t(e)] : dst[size_t(2 * e)] | dst[size_t(2 * e + 1)] << 8;
    }
    void set(int e, int v)
    {
        if (f.bytes == 1) {
            dst[size_t(e)] = uint8_t(v);
        } else {
            dst[size_t(2 * e)] = uint8_t(v);
            dst[size_t(2 * e + 1)] = uint8_t(v >> 8);
        }
    }
    // Kind of element e: 0 luma (RGBQ sample 0), 1 Cb, 2 Cr, 3 RGBQ sample 3.
    int kind(int e) const { return f.pairs ? (e % 2 == 0 ? 0 : e % 4 == 1 ? 1 : 2) : e % 4; }
    // The whole buffer at one value per kind; alpha everywhere a13.
    void fill_buffer(const int32_t (&b)[4], int32_t a13)
    {
        for (int e = -64; e < 192; ++e) c.line[e] = int16_t(b[f.pairs ? (e & 1 ? ((e & 3) == 1 ? 1 : 2) : 0) : (e & 3)]);
        for (int i = -32; i < 64; ++i) c.line_a[i] = int16_t(a13);
    }
    void run(Family fam, int slot) { fam == Family::ALPHA ? H_ALPHA[size_t(slot)](c, s) : f.table(fam)[size_t(slot)](c, s); }
};

// ---- the rules, as the families define them ---------------------------------
//
// Notation: S the computed sample in stored depth, S13 in buffer units (fast
// form), D the destination sample, Da its alpha word, o the offset of the
// sample, L the level, c the pixel's weight (c14 in _SA, c12 elsewhere), A the
// source alpha (1/16384 in _SA, 1/4096 in _SA_DA and H_ALPHA). Results that the
// rules leave unclamped are returned as they are; a store keeps their low bits.

struct Sample {
    int elem;     // element of the colour plane
    bool chroma;  // takes the chroma offset, and in _SA/_SA_DA no renormalising
    int32_t S;    // stored depth
    int32_t S13;  // buffer units
};

struct Ctx {
    const Fmt& f;
    int32_t L;
    bool tile;
    bool pre;  // destination colour premultiplied (dst_assoc 2)
};

int32_t off(const Fmt& f, bool chroma) { return chroma ? f.co : f.yo; }
int64_t lim(const Fmt& f, int64_t v) { return std::clamp<int64_t>(v, 0, f.max); }
// C division truncates toward zero, as the rules require.
int64_t div0(int64_t a, int64_t b) { return a / b; }

// _DA: the source counts as opaque.
void da_whole(const Ctx& k, std::vector<int64_t>& d, int64_t& Da, const std::vector<Sample>& px)
{
    const int64_t L = k.L;
    if (L == 4096) {
        Da = 4096;
        for (const auto& p : px) d[size_t(p.elem)] = p.S;
        return;
    }
    if (k.tile) {
        Da = L;
        for (const auto& p : px) {
            const int32_t o = off(k.f, p.chroma);
            d[size_t(p.elem)] = k.pre ? (((p.S - o) * L + 2048) >> 12) + o : p.S;
        }
        return;
    }
    if (k.pre) {
        Da = ((Da * (4096 - L) + 2048) >> 12) + L;
        for (const auto& p : px) d[size_t(p.elem)] = (d[size_t(p.elem)] * (4096 - L) + p.S * L + 2048) >> 12;
        return;
    }
    const int64_t dd = ((4096 - L) * Da + 2048) >> 12, t = dd + L;
    Da = t;
    for (const auto& p : px) d[size_t(p.elem)] = lim(k.f, div0(d[size_t(p.elem)] * dd + p.S * L + t / 2, t));
}

void da_partial(const Ctx& k, std::vector<int64_t>& d, int64_t& Da, const std::vector<Sample>& px, int64_t c)
{
    if (k.tile && k.pre) {
        Da = Da + c;  // never clamped: tiles add up
        for (const auto& p : px) {
            const int32_t o = off(k.f, p.chroma);
            d[size_t(p.elem)] = d[size_t(p.elem)] + (((p.S - o) * c + 2048) >> 12);  // not clamped
        }
    } else if (k.tile) {
        if (c == 0) return;
        const int64_t old = Da, t = Da + c;
        Da = t;
        for (const auto& p : px) d[size_t(p.elem)] = div0(d[size_t(p.elem)] * old + p.S * c + t / 2, t);
    } else if (k.pre) {
        Da = ((Da * (4096 - c) + 2048) >> 12) + c;
        for (const auto& p : px) d[size_t(p.elem)] = (d[size_t(p.elem)] * (4096 - c) + p.S * c + 2048) >> 12;
    } else {
        if (c == 0) return;
        const int64_t dd = ((4096 - c) * Da + 2048) >> 12, t = dd + c;
        Da = t;
        for (const auto& p : px) d[size_t(p.elem)] = div0(d[size_t(p.elem)] * dd + p.S * c + t / 2, t);
    }
}

// _SA, general form. Luma (every RGBQ sample) with A above 16384 is first
// brought back to full opacity; chroma keeps S and A.
bool sa_renorm(const Sample& p, int64_t A) { return A > 16384 && !p.chroma; }

void sa_whole(const Ctx& k, std::vector<int64_t>& d, const std::vector<Sample>& px, int64_t A)
{
    if (A < 1) return;
    const int64_t L = k.L;
    for (const auto& p : px) {
        const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)], S = p.S;
        int64_t v;
        if (L == 4096 && sa_renorm(p, A)) {
            v = div0((S - o) * 16384, A) + o;
        } else if (L == 4096) {
            v = (((D - o) * (16384 - A) + 8192) >> 14) + S;  // chroma above 16384 with A as it is
        } else if (sa_renorm(p, A)) {
            v = ((div0((S - o) * 16384, A) + o) * L + (4096 - L) * D + 2048) >> 12;
        } else {
            const int64_t e = A > 16384 ? L : (A * L + 8192) >> 14;
            v = (((D - o) * (4096 - e) + (S - o) * L + 2048) >> 12) + o;
        }
        d[size_t(p.elem)] = lim(k.f, v);
    }
}

void sa_partial(const Ctx& k, std::vector<int64_t>& d, const std::vector<Sample>& px, int64_t A, int64_t c)
{
    if (A < 1) return;
    for (const auto& p : px) {
        const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)], S = p.S;
        int64_t v;
        if (k.tile) {
            const int64_t part = sa_renorm(p, A) ? div0((S - o) * 16384, A) : S - o;
            v = D + ((part * c + 8192) >> 14);
        } else if (sa_renorm(p, A)) {
            v = ((div0((S - o) * 16384, A) + o) * c + (16384 - c) * D + 8192) >> 14;
        } else {
            const int64_t e = A > 16384 ? c : (c * A + 8192) >> 14;
            v = (((D - o) * (16384 - e) + (S - o) * c + 8192) >> 14) + o;
        }
        d[size_t(p.elem)] = lim(k.f, v);
    }
}

// _SA, fast form (clamp 0, level 4096, slots 2 to 5): S13 in buffer units,
// m = 16384 - A, black 512 and neutral 4096 in buffer units (0 in RGBQ). For
// 8 bits: whole (S13 + (((D - o) m) >> 9) + 16) >> 5; tile
// clamp(D + (((S13 - 512) c + 0x40000) >> 19)); overlay with e = (A c + 256)
// >> 9: (((D - o)(0x80000 - e) + (S13 - 512) c + 0x40000) >> 19) + o. For 10
// bits the shifts are 11, 3, 17 with + 4, + 1024, 0x20000 and 0x10000. Chroma is
// clamped everywhere, luma and RGBQ samples in tile only.
void sa_fast_whole(const Ctx& k, std::vector<int64_t>& d, const std::vector<Sample>& px, int64_t A)
{
    if (A < 1) return;
    const int sh = k.f.sh;
    const int64_t m = 16384 - A;
    for (const auto& p : px) {
        const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)];
        const int64_t v = (p.S13 + (((D - o) * m) >> (14 - sh)) + (1 << (sh - 1))) >> sh;
        d[size_t(p.elem)] = p.chroma ? lim(k.f, v) : v;
    }
}

void sa_fast_partial(const Ctx& k, std::vector<int64_t>& d, const std::vector<Sample>& px, int64_t A, int64_t c)
{
    if (A < 1) return;
    const int sh = k.f.sh;
    for (const auto& p : px) {
        const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)];
        const int64_t black = k.f.pairs ? (p.chroma ? 4096 : 512) : 0;
        if (k.tile) {
            d[size_t(p.elem)] = lim(k.f, D + (((p.S13 - black) * c + (int64_t(1) << (13 + sh))) >> (14 + sh)));
        } else {
            const int64_t e = (A * c + (int64_t(1) << (13 - sh))) >> (14 - sh);
            const int64_t v =
                (((D - o) * ((int64_t(1) << (14 + sh)) - e) + (p.S13 - black) * c + (int64_t(1) << (13 + sh))) >>
                 (14 + sh)) + o;
            d[size_t(p.elem)] = p.chroma ? lim(k.f, v) : v;
        }
    }
}

// _SA_DA, all in 12 bits.
void sada_whole(const Ctx& k, std::vector<int64_t>& d, int64_t& Da, const std::vector<Sample>& px, int64_t A)
{
    if (A < 1) return;
    const int64_t L = k.L;
    if (L == 4096) {
        if (A >= 4096) {
            Da = 4096;
            for (const auto& p : px) {
                const int64_t o = off(k.f, p.chroma);
                d[size_t(p.elem)] = lim(k.f, p.chroma ? p.S : div0((p.S - o) * 4096, A) + o);
            }
        } else if (k.tile) {
            Da = A;
            for (const auto& p : px) {
                const int64_t o = off(k.f, p.chroma);
                d[size_t(p.elem)] = lim(k.f, k.pre ? p.S : div0((p.S - o) * 4096, A) + o);
            }
        } else if (k.pre) {
            Da = ((Da * (4096 - A) + 2048) >> 12) + A;
            for (const auto& p : px) {
                const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)];
                d[size_t(p.elem)] = lim(k.f, (((D - o) * (4096 - A) + 2048) >> 12) + p.S);
            }
        } else {
            const int64_t dd = ((4096 - A) * Da + 2048) >> 12, t = A + dd;
            if (t == 0) return;
            Da = t;
            for (const auto& p : px) {
                const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)];
                d[size_t(p.elem)] = lim(k.f, div0((D - o) * dd + (p.S - o) * 4096, t) + o);
            }
        }
        return;
    }
    const bool over = A > 4096;
    const int64_t a = over ? L : (A * L + 2048) >> 12;
    // S - o; luma over 4096 replaced by r = ((S - o) 4096) / A.
    const auto part = [&](const Sample& p) {
        const int64_t v = p.S - off(k.f, p.chroma);
        return over && !p.chroma ? div0(v * 4096, A) : v;
    };
    if (k.tile && k.pre) {
        Da = a;
        for (const auto& p : px)
            d[size_t(p.elem)] = lim(k.f, ((part(p) * L + 2048) >> 12) + off(k.f, p.chroma));
    } else if (k.tile) {
        if (!over && a == 0) return;
        Da = a;
        for (const auto& p : px) {
            const int64_t o = off(k.f, p.chroma);
            d[size_t(p.elem)] = lim(k.f, over && !p.chroma ? part(p) + o : div0((p.S - o) * L, a) + o);
        }
    } else if (k.pre) {
        Da = ((Da * (4096 - a) + 2048) >> 12) + a;
        for (const auto& p : px) {
            const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)];
            d[size_t(p.elem)] = lim(k.f, (((D - o) * (4096 - a) + part(p) * L + 2048) >> 12) + o);
        }
    } else {
        const int64_t dd = ((4096 - a) * Da + 2048) >> 12, t = a + dd;
        if (t == 0) return;
        Da = t;
        for (const auto& p : px) {
            const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)];
            d[size_t(p.elem)] = lim(k.f, div0((D - o) * dd + part(p) * L, t) + o);
        }
    }
}

void sada_partial(const Ctx& k, std::vector<int64_t>& d, int64_t& Da, const std::vector<Sample>& px, int64_t A,
                  int64_t c)
{
    if (A < 1) return;
    const bool over = A > 4096;
    const int64_t e = over ? c : (c * A + 2048) >> 12;
    int64_t weight_d;  // the destination's weight where the rule divides
    int64_t na;        // the new Da
    if (k.tile && k.pre) {
        weight_d = 0;
        na = Da + e;
    } else if (k.tile) {
        if (e <= 0) return;
        weight_d = Da;
        na = Da + e;
    } else if (k.pre) {
        weight_d = 0;
        na = ((Da * (4096 - e) + 2048) >> 12) + e;
    } else {
        if (e <= 0) return;
        weight_d = ((4096 - e) * Da + 2048) >> 12;
        na = weight_d + e;
    }
    for (const auto& p : px) {
        if (p.chroma && na == 0) continue;  // chroma only under a non-zero new alpha
        const int64_t o = off(k.f, p.chroma), D = d[size_t(p.elem)];
        const int64_t s = over && !p.chroma ? div0((p.S - o) * 4096, A) + o : p.S;
        int64_t v;
        if (k.tile && k.pre)
            v = D + (((s - o) * c + 2048) >> 12);
        else if (k.pre)
            v = (((D - o) * (4096 - e) + (s - o) * c + 2048) >> 12) + o;
        else
            v = div0((D - o) * weight_d + (s - o) * c, na) + o;
        d[size_t(p.elem)] = lim(k.f, v);
    }
    Da = na;
}

// H_ALPHA: D is the alpha word. The bank kernels limit an overshooting A in
// whole pixels; the other kernels and the partial rule do not.
void alpha_whole(const Ctx& k, int64_t& D, int64_t A, bool bank)
{
    if (A <= 0) return;
    if (k.L == 4096) {
        if (bank && A >= 4096)
            D = 4096;
        else
            D = k.tile ? A : (((4096 - A) * D + 2048) >> 12) + A;
        return;
    }
    const int64_t e = bank && A > 4096 ? k.L : (A * k.L + 2048) >> 12;
    if (!bank && e <= 0) return;
    D = k.tile ? e : (((4096 - e) * D + 2048) >> 12) + e;
}

void alpha_partial(const Ctx& k, int64_t& D, int64_t A, int64_t c)
{
    if (A <= 0) return;
    const int64_t e = (c * A + 2048) >> 12;
    D = k.tile ? D + e : (((4096 - e) * D + 2048) >> 12) + e;  // the tile sum is a 16-bit sum
}

// ---- the sweep of the main kernels ------------------------------------------

// Where the strip lies: a whole pair (two whole pixels from pixel 0), one
// partly covered even pixel, one whole odd pixel alone (for pairs: the partial
// rule at full weight, luma only), and a whole pair on a partly covered line.
enum Geo { kWholePair, kPartialEven, kSingleOdd, kPartialLine };
const char* const kGeoNames[] = {"whole pair", "partial even pixel", "single odd pixel", "partial line"};

struct Geometry {
    int32_t x, first_cover, width16, vcover;
};
Geometry geometry(Geo g)
{
    switch (g) {
    case kWholePair: return {0, 0x10000, 0x20000, 16384};
    case kPartialEven: return {0, 0x6000, 0x6000, 16384};
    case kSingleOdd: return {1, 0x10000, 0x10000, 16384};
    case kPartialLine: return {0, 0x10000, 0x20000, 12288};
    }
    return {};
}

// Colour sets, in buffer units per kind (luma, Cb, Cr, fourth RGBQ sample):
// in range but off the stored grid, and hot values that leave the range
// (from an overshooting filter), which only the clamps bring back.
const int32_t kColours[][4] = {
    {3214, 1939, 6390, 5213},
    {8800, -200, 8500, 8700},
};
// Destination sets per kind for pixels 0 and 1, by stored depth, and alpha
// words for pixels 0 and 1.
int32_t dest_value(const Fmt& f, int kind, int pixel, int set)
{
    static const int32_t d8[2][2][4] = {{{180, 90, 170, 240}, {40, 0, 0, 250}},
                                        {{250, 20, 250, 3}, {17, 0, 0, 128}}};
    const int32_t v = d8[set][pixel & 1][kind];
    return f.bytes == 2 ? v * 4 + 1 : v;
}
const int32_t kDestAlphas[][2] = {{1000, 3000}, {0, 0}, {4000, 4096}};

struct SweepCase {
    Family fam;
    const Fmt* f;
    int slot;
    Geo geo;
    bool tile;
    int assoc;
    int32_t level;
    bool clamp;
    int32_t a13;
    int colours, dset, daset;
};

std::string describe(const SweepCase& k)
{
    std::ostringstream o;
    o << family_name(k.fam) << " " << k.f->name << " slot " << k.slot << ", " << kGeoNames[k.geo] << ", tile "
      << k.tile << ", dst_assoc " << k.assoc << ", level " << k.level << ", clamp " << k.clamp << ", line_a "
      << k.a13 << ", colours " << k.colours << ", dest set " << k.dset << ", dest alpha set " << k.daset;
    return o.str();
}

// Which slots clamp S always, whatever `clamp` says.
bool clamps_sample(const SweepCase& k)
{
    if (k.clamp) return true;
    switch (k.fam) {
    case Family::SA_DA: return true;
    case Family::SA: return k.slot >= 6;  // more than 4 taps
    case Family::DA: return k.slot >= 8;  // more than 8 taps
    case Family::ALPHA: return false;
    }
    return false;
}

bool fast_form(const SweepCase& k)
{
    return k.fam == Family::SA && !k.clamp && k.level == 4096 && k.slot >= 2 && k.slot <= 5;
}

// The samples of pixel x, with or without its pair's chroma.
std::vector<Sample> pixel_samples(const SweepCase& k, int x, bool clampS)
{
    const Fmt& f = *k.f;
    const int32_t* b = kColours[k.colours];
    const auto stored = [&](int32_t b13) {
        const int32_t v = (b13 + (1 << (f.sh - 1))) >> f.sh;
        return clampS ? int32_t(std::clamp(v, 0, f.max)) : v;
    };
    std::vector<Sample> px;
    if (!f.pairs) {
        for (int e = 0; e < 4; ++e) px.push_back({4 * x + e, false, stored(b[e]), b[e]});
        return px;
    }
    px.push_back({2 * x, false, stored(b[0]), b[0]});
    if (x % 2 == 0) {
        px.push_back({2 * x + 1, true, stored(b[1]), b[1]});
        px.push_back({2 * x + 3, true, stored(b[2]), b[2]});
    }
    return px;
}

void run_sweep_case(const SweepCase& k)
{
    const Fmt& f = k.fam == Family::ALPHA ? kAlphaOnly : *k.f;
    Rig r(f);
    const Geometry g = geometry(k.geo);
    r.c.level = k.level;
    r.c.tile = k.tile;
    r.c.dst_assoc = uint8_t(k.assoc);
    r.c.clamp = k.clamp;
    r.c.vcover = g.vcover;
    r.s.phase = k.slot == 2 ? 0 : 16 << 16;
    r.s.x = g.x;
    r.s.first_cover = g.first_cover;
    r.s.width16 = g.width16;
    r.fill_buffer(kColours[k.colours], k.a13);

    std::vector<int64_t> d(size_t(r.elems()));
    std::vector<int64_t> da(kPixels);
    if (k.fam == Family::ALPHA) {
        static const int32_t words[][2] = {{1000, 3000}, {0, 0}, {65000, 65500}};
        for (int x = 0; x < kPixels; ++x) da[size_t(x)] = words[k.daset][x & 1] + x;
    } else {
        for (int e = 0; e < r.elems(); ++e) d[size_t(e)] = dest_value(f, r.kind(e), (e / (f.pairs ? 2 : 4)), k.dset);
        for (int x = 0; x < kPixels; ++x) da[size_t(x)] = kDestAlphas[k.daset][x & 1];
    }
    for (int e = 0; e < r.elems(); ++e) r.set(e, int(d[size_t(e)]));
    for (int x = 0; x < kPixels; ++x) r.dalpha[size_t(x)] = uint16_t(da[size_t(x)]);

    // The walk: which pixels, whole or partial, and their weights. Whole
    // pixels need a wholly covered line and pixel; where the run goes by
    // pairs (4:2:2, and the RGBQ area kernel) only both pixels of a pair
    // starting on an even pixel are whole.
    const Ctx ctx{f, k.level, k.tile, k.assoc == 2};
    const bool clampS = clamps_sample(k);
    const bool pairs_run = f.pairs || (k.slot == 2 && k.fam != Family::ALPHA);
    const int last = g.x + ((g.width16 + 0xFFFF) >> 16) - 1;
    bool in_run = false;
    for (int x = g.x; x <= last; ++x) {
        const int32_t hc = x == g.x ? g.first_cover : std::min(g.width16 - (x - g.x) * 0x10000, 0x10000);
        bool whole = g.vcover == 16384 && hc == 0x10000;
        if (whole && pairs_run) whole = x % 2 == 0 ? x + 1 <= last : in_run;
        in_run = whole;
        if (k.fam == Family::ALPHA) {
            const int64_t A = (int64_t(k.a13) * 0x10000 + 0x20000) >> 18;
            if (whole)
                alpha_whole(ctx, da[size_t(x)], A, k.slot >= 4);
            else
                alpha_partial(ctx, da[size_t(x)], A, c12(hc, g.vcover, k.level));
            continue;
        }
        const std::vector<Sample> px = pixel_samples(k, x, clampS);
        switch (k.fam) {
        case Family::DA:
            if (whole)
                da_whole(ctx, d, da[size_t(x)], px);
            else
                da_partial(ctx, d, da[size_t(x)], px, c12(hc, g.vcover, k.level));
            break;
        case Family::SA:
            if (fast_form(k)) {
                if (whole)
                    sa_fast_whole(ctx, d, px, k.a13);
                else
                    sa_fast_partial(ctx, d, px, k.a13, c14(hc, g.vcover, 4096));
            } else if (whole) {
                sa_whole(ctx, d, px, k.a13);
            } else {
                sa_partial(ctx, d, px, k.a13, c14(hc, g.vcover, k.level));
            }
            break;
        case Family::SA_DA: {
            const int64_t A = (int64_t(k.a13) + 2) >> 2;
            if (whole)
                sada_whole(ctx, d, da[size_t(x)], px, A);
            else
                sada_partial(ctx, d, da[size_t(x)], px, A, c12(hc, g.vcover, k.level));
            break;
        }
        case Family::ALPHA: break;
        }
    }

    r.run(k.fam, k.slot);

    const int mask = f.bytes == 1 ? 0xFF : 0xFFFF;
    for (int e = 0; k.fam != Family::ALPHA && e < r.elems(); ++e)
        ASSERT_EQ(r.get(e), int(d[size_t(e)] & mask))
            << describe(k) << ": element " << e << " (pixel " << e / (f.pairs ? 2 : 4) << ")";
    for (int x = 0; x < kPixels; ++x)
        ASSERT_EQ(r.dalpha[size_t(x)], uint16_t(da[size_t(x)])) << describe(k) << ": alpha word of pixel " << x;
    for (size_t i = size_t(r.elems() * f.bytes); k.fam != Family::ALPHA && i < r.dst.size(); ++i)
        ASSERT_EQ(r.dst[i], 0x5A) << describe(k) << ": byte " << i << " past the line written";
}

// Every combination of the parameters that the family reads. Families
// without a destination alpha plane run with one association and one set of
// alpha words (which must then stay as they are); the alpha-only table has no
// colour.
void sweep(Family fam, const Fmt& f, const std::vector<int>& slots, const std::vector<int32_t>& alphas)
{
    const bool dest_alpha = fam == Family::DA || fam == Family::SA_DA || fam == Family::ALPHA;
    const std::vector<int> assocs = fam == Family::DA || fam == Family::SA_DA ? std::vector<int>{2, 1, 0}
                                                                              : std::vector<int>{2};
    const int colour_sets = fam == Family::ALPHA ? 1 : 2;
    const int alpha_sets = dest_alpha ? 3 : 1;
    for (int slot : slots)
        for (int geo = 0; geo < 4; ++geo)
            for (bool tile : {false, true})
                for (int assoc : assocs)
                    for (int32_t level : {4096, 2048, 3000, 1000, 6000})
                        for (bool clamp : {false, true})
                            for (int32_t a13 : alphas)
                                if (!clamp || fam == Family::SA || fam == Family::DA)  // the others always clamp, or never
                                for (int colours = 0; colours < colour_sets; ++colours)
                                    for (int daset = 0; daset < alpha_sets; ++daset) {
                                        run_sweep_case({fam, &f, slot, Geo(geo), tile, assoc, level, clamp, a13,
                                                        colours, colours, daset});
                                        if (::testing::Test::HasFatalFailure()) return;
                                    }
}

// Area, linear and bank slots where a family changes behaviour: the fast
// source-alpha form ends after slot 5 (4 taps), _SA clamps always from slot 6
// (6 taps), _DA from slot 8 (10 taps); the alpha-only banks limit an
// overshoot.
const std::vector<int> kDestAlphaSlots = {2, 3, 4, 7, 8, 11};
const std::vector<int> kSourceAlphaSlots = {2, 3, 4, 5, 6, 11};
const std::vector<int> kBothSlots = {2, 3, 5, 11};
const std::vector<int> kAlphaOnlySlots = {2, 3, 4, 9};

TEST(AlphaComposition, DestinationAlphaFamilyFollowsItsRules)
{
    for (const Fmt* f : kColourFmts) {
        SCOPED_TRACE(f->name);
        sweep(Family::DA, *f, kDestAlphaSlots, {0});
    }
}

TEST(AlphaComposition, SourceAlphaFamilyFollowsItsRules)
{
    // 0 writes nothing; 1 is the least alpha that draws; above 16384 only an
    // overshooting filter can reach.
    for (const Fmt* f : kColourFmts) {
        SCOPED_TRACE(f->name);
        sweep(Family::SA, *f, kSourceAlphaSlots, {0, 1, 5000, 8192, 12000, 16384, 18000});
    }
}

TEST(AlphaComposition, SourceAndDestinationAlphaFamilyFollowsItsRules)
{
    // line_a 4 is alpha 1/4096, 1 the least that draws; 2 rounds to 1/4096 too;
    // 1 rounds to 0 and draws nothing.
    for (const Fmt* f : kColourFmts) {
        SCOPED_TRACE(f->name);
        sweep(Family::SA_DA, *f, kBothSlots, {0, 1, 4, 8192, 12000, 16384, 18000});
    }
}

TEST(AlphaComposition, AlphaOnlyTableFollowsItsRules)
{
    sweep(Family::ALPHA, kYuy2, kAlphaOnlySlots, {0, 1, 2, 5000, 8192, 16384, 18000});
}


// ---- constant regions (slots 0 and 1) ----------------------------------------

// The left region paints pixels 0 (coverage 0x8000), 1 and 2 from buffer pixel
// `pad_left` 4; the right region pixels 3, 4 and 5 (coverage 0x4000) from
// pixel `last` 9. Everything else of the buffer holds other values, so that
// a read of the wrong element shows.
struct RegionCase {
    Family fam;
    const Fmt* f;
    bool right;
    bool tile;
    int assoc;
    int32_t level;
    int32_t vcover;
    int32_t a13;
    int colours;
    int daset;
};

std::string describe(const RegionCase& k)
{
    std::ostringstream o;
    o << family_name(k.fam) << " " << k.f->name << (k.right ? " right" : " left") << " region, tile " << k.tile
      << ", dst_assoc " << k.assoc << ", level " << k.level << ", vcover " << k.vcover << ", line_a " << k.a13
      << ", colours " << k.colours << ", dest alpha set " << k.daset;
    return o.str();
}

// Buffer values read by a region: in range but off the stored grid (the
// truncation shows), and beyond the range.
const int32_t kRegionColours[][4] = {
    {3231, 1951, 8175, 5119},
    {8800, -20, 8191, 8600},
};

void run_region_case(const RegionCase& k)
{
    const Fmt& f = k.fam == Family::ALPHA ? kAlphaOnly : *k.f;
    Rig r(f);
    r.c.level = k.level;
    r.c.tile = k.tile;
    r.c.dst_assoc = uint8_t(k.assoc);
    r.c.vcover = k.vcover;
    r.s.pad_left = 4;
    r.s.last = 9;
    r.s.left_x = 0;
    r.s.left_first_cover = 0x8000;
    r.s.left_width16 = 0x28000;
    r.s.right_x = 3;
    r.s.right_first_cover = 0x10000;
    r.s.right_width16 = 0x24000;
    const int32_t junk[4] = {5555, 2222, 7777, 1111};
    r.fill_buffer(junk, 9999);
    const int32_t* b = kRegionColours[k.colours];
    const int at = k.right ? 9 : 4;
    if (f.pairs) {
        r.c.line[2 * at] = int16_t(b[0]);
        r.c.line[k.right ? 2 * at - 1 : 2 * at + 1] = int16_t(b[1]);
        r.c.line[k.right ? 2 * at + 1 : 2 * at + 3] = int16_t(b[2]);
    } else {
        for (int e = 0; e < 4; ++e) r.c.line[4 * at + e] = int16_t(b[e]);
    }
    r.c.line_a[at] = int16_t(k.a13);

    std::vector<int64_t> d(size_t(r.elems()));
    std::vector<int64_t> da(kPixels);
    for (int e = 0; e < r.elems(); ++e) d[size_t(e)] = dest_value(f, r.kind(e), e / (f.pairs ? 2 : 4), k.colours);
    static const int32_t words[][2] = {{1000, 3000}, {0, 0}, {65000, 4000}};
    for (int x = 0; x < kPixels; ++x) da[size_t(x)] = words[k.daset][x & 1] + (k.daset == 1 ? 0 : x);
    for (int e = 0; k.fam != Family::ALPHA && e < r.elems(); ++e) r.set(e, int(d[size_t(e)]));
    for (int x = 0; x < kPixels; ++x) r.dalpha[size_t(x)] = uint16_t(da[size_t(x)]);

    // Set-up, once: truncation to stored depth, then the family's treatment
    // of source alpha and its clamp.
    int64_t S[4];
    for (int e = 0; e < 4; ++e) S[e] = b[e] >> f.sh;  // no rounding term
    const int renormed = f.pairs ? 1 : 4;           // luma, or every RGBQ sample
    int64_t A = 0;
    bool draws = true;
    switch (k.fam) {
    case Family::DA:
        for (auto& v : S) v = lim(f, v);
        break;
    case Family::SA:
        A = k.a13;
        if (A < 1) draws = false;
        if (A > 16384) {
            for (int e = 0; e < renormed; ++e) S[e] = div0((S[e] - f.yo) * 16384, A) + f.yo;
            A = 16384;
        }
        for (auto& v : S) v = lim(f, v);
        break;
    case Family::SA_DA:
        A = (k.a13 + 2) >> 2;
        if (A < 1) draws = false;
        if (A > 4096) {
            for (int e = 0; e < renormed; ++e) S[e] = div0((S[e] - f.yo) * 4096, A) + f.yo;
            A = 4096;
        }
        break;  // no clamp here: the partial rule clamps its results
    case Family::ALPHA:
        A = std::min<int64_t>((k.a13 + 2) >> 2, 4096);
        if (A < 1) draws = false;
        break;
    }

    const int32_t x0 = k.right ? 3 : 0;
    int32_t hc = k.right ? 0x10000 : 0x8000;
    int32_t rem = k.right ? 0x24000 : 0x28000;
    const Ctx ctx{f, k.level, k.tile, k.assoc == 2};
    for (int x = x0; draws; ++x) {
        if (k.fam == Family::ALPHA) {
            A = (c12(hc, k.vcover, k.level) * A + 2048) >> 12;  // carries to the next pixel
            da[size_t(x)] = k.tile ? da[size_t(x)] + A : (((4096 - A) * da[size_t(x)] + 2048) >> 12) + A;
        } else {
            std::vector<Sample> px;
            if (!f.pairs) {
                for (int e = 0; e < 4; ++e) px.push_back({4 * x + e, false, int32_t(S[e]), 0});
            } else {
                px.push_back({2 * x, false, int32_t(S[0]), 0});
                if (x % 2 == 0) {
                    px.push_back({2 * x + 1, true, int32_t(S[1]), 0});
                    px.push_back({2 * x + 3, true, int32_t(S[2]), 0});
                }
            }
            switch (k.fam) {
            case Family::DA: da_partial(ctx, d, da[size_t(x)], px, c12(hc, k.vcover, k.level)); break;
            case Family::SA_DA: sada_partial(ctx, d, da[size_t(x)], px, A, c12(hc, k.vcover, k.level)); break;
            case Family::SA: {
                const int64_t c = c14(hc, k.vcover, k.level), e = (c * A + 8192) >> 14;
                for (auto& p : px) {
                    const int64_t o = off(f, p.chroma), D = d[size_t(p.elem)];
                    if (k.tile) {
                        const int64_t sum = D + (((p.S - o) * c + 8192) >> 14);
                        d[size_t(p.elem)] = lim(f, sum);
                        if (!f.pairs) S[p.elem % 4] = sum;  // the RGBQ tile region runs on its sums
                    } else {
                        d[size_t(p.elem)] = (((D - o) * (16384 - e) + (p.S - o) * c + 8192) >> 14) + o;  // not clamped
                    }
                }
                break;
            }
            case Family::ALPHA: break;
            }
        }
        rem -= hc;
        if (rem <= 0) break;
        hc = std::min(rem, 0x10000);
    }

    r.run(k.fam, k.right ? 1 : 0);

    const int mask = f.bytes == 1 ? 0xFF : 0xFFFF;
    for (int e = 0; k.fam != Family::ALPHA && e < r.elems(); ++e)
        ASSERT_EQ(r.get(e), int(d[size_t(e)] & mask))
            << describe(k) << ": element " << e << " (pixel " << e / (f.pairs ? 2 : 4) << ")";
    for (int x = 0; x < kPixels; ++x)
        ASSERT_EQ(r.dalpha[size_t(x)], uint16_t(da[size_t(x)])) << describe(k) << ": alpha word of pixel " << x;
}

TEST(AlphaComposition, ConstantRegionsOfEveryFamily)
{
    for (Family fam : {Family::DA, Family::SA, Family::SA_DA, Family::ALPHA})
        for (const Fmt* f : kColourFmts)
            for (bool right : {false, true})
                for (bool tile : {false, true})
                    for (int assoc : {2, 1})
                        for (int32_t level : {4096, 2048})
                            for (int32_t vcover : {16384, 12288})
                                for (int32_t a13 : {0, 1, 4, 8192, 16384, 18000})
                                    for (int colours = 0; colours < 2; ++colours)
                                        for (int daset = 0; daset < 3; ++daset) {
                                            const bool dest_alpha = fam != Family::SA;
                                            if (!dest_alpha && (assoc != 2 || daset != 0)) continue;
                                            if (fam == Family::DA && a13 != 0) continue;
                                            if (fam == Family::ALPHA && (f != &kYuy2 || assoc != 2 || colours)) continue;
                                            run_region_case({fam, f, right, tile, assoc, level, vcover, a13, colours, daset});
                                            if (HasFatalFailure()) return;
                                        }
}

// ---- hand-worked pixels ---------------------------------------------------------

// Pixel `x` of the geometry, with its pair's chroma (or the four RGBQ
// samples). Every destination pixel starts at d; every buffer sample of a kind
// holds b; alpha everywhere line_a = a13.
struct Worked {
    const char* what;
    Family fam;
    const Fmt* f;
    int slot;
    Geo geo;
    bool tile;
    int assoc;
    int32_t level;
    bool clamp;
    int32_t a13;
    int32_t b[4];
    int32_t d[4];
    int32_t da;
    int32_t want[4];
    int32_t want_da;
};

// Each expected value is worked by hand from the rule named in `what`.
const Worked kWorked[] = {
    // _DA, overlay, straight destination with alpha 0 at level 2048:
    // d = 0, t = 2048, D = (0 + S 2048 + 1024) / 2048 = S.
    {"DA straight overlay keeps the colour at any alpha", Family::DA, &kYuy2, 3, kWholePair, false, 1, 2048, false, 0,
     {3200, 3200, 4800, 0}, {60, 200, 30, 0}, 0, {100, 100, 150, 0}, 2048},
    // d = ((4096 - 1536) 1000 + 2048) >> 12 = 625, t = 2161;
    // luma (60 625 + 100 1536 + 1080) / 2161 = 88, Cb 279680 / 2161 = 129, Cr 250230 / 2161 = 115.
    {"DA straight overlay partial divides by the new alpha", Family::DA, &kYuy2, 2, kPartialEven, false, 1, 4096,
     false, 0, {3200, 3200, 4800, 0}, {60, 200, 30, 0}, 1000, {88, 129, 115, 0}, 2161},
    // Tile, premultiplied destination, the odd pixel alone at full weight
    // (c12 4096): 200 + ((239 4096 + 2048) >> 12) = 439, stored as 439 - 256;
    // the alpha word adds past 4096. Chroma of the pair is not touched.
    {"DA premultiplied tile partial wraps above the maximum", Family::DA, &kYuy2, 3, kSingleOdd, true, 2, 4096, false,
     0, {8160, 3200, 3200, 0}, {200, 90, 170, 0}, 3000, {183, 90, 170, 0}, 7096},
    // 10 + ((-16 4096 + 2048) >> 12) = 10 - 16 = -6, stored as 250.
    {"DA premultiplied tile partial wraps below zero", Family::DA, &kYuy2, 3, kSingleOdd, true, 2, 4096, false, 0,
     {0, 3200, 3200, 0}, {10, 90, 170, 0}, 3000, {250, 90, 170, 0}, 7096},

    // _SA general form (clamp set) at alpha 1.0: the destination weighs 0.
    {"SA whole pixel at alpha 16384 is S", Family::SA, &kYuy2, 3, kWholePair, false, 2, 4096, true, 16384,
     {3200, 3200, 4800, 0}, {60, 200, 30, 0}, 0, {100, 100, 150, 0}, 0},
    // Fast form: (S13 + 0 + 16) >> 5: 3230 >> 5 = 100, 4830 >> 5 = 150.
    {"SA fast whole pixel at alpha 16384 is S", Family::SA, &kYuy2, 3, kWholePair, false, 2, 4096, false, 16384,
     {3214, 3214, 4814, 0}, {60, 200, 30, 0}, 0, {100, 100, 150, 0}, 0},
    {"SA alpha 0 leaves the pixel alone", Family::SA, &kYuy2, 2, kWholePair, false, 2, 4096, false, 0,
     {3200, 3200, 4800, 0}, {60, 200, 30, 0}, 0, {60, 200, 30, 0}, 0},
    // Overshoot 18000, general form at level 4096: luma (184 16384) / 18000 + 16
    // = 183; chroma with A as it is: Cb ((72 (-1616) + 8192) >> 14) + 100 = 93,
    // Cr ((-98 (-1616) + 8192) >> 14) + 150 = 160.
    {"SA overshoot brings luma back, not chroma", Family::SA, &kYuy2, 3, kWholePair, false, 2, 4096, true, 18000,
     {6400, 3200, 4800, 0}, {60, 200, 30, 0}, 0, {183, 93, 160, 0}, 0},
    // Partial overlay at level 3000: c14 = (6144 3000 + 2048) >> 12 = 4500,
    // e = (4500 12000 + 8192) >> 14 = 3296; luma ((44 13088 + 84 4500 + 8192)
    // >> 14) + 16 = 74; Cb ((72 13088 - 28 4500 + 8192) >> 14) + 128 = 178;
    // Cr ((-98 13088 + 22 4500 + 8192) >> 14) + 128 = -72 + 128 = 56.
    {"SA partial overlay at level 3000", Family::SA, &kYuy2, 5, kPartialEven, false, 2, 3000, false, 12000,
     {3200, 3200, 4800, 0}, {60, 200, 30, 0}, 0, {74, 178, 56, 0}, 0},
    // Fast whole, m = 8192: luma (8160 + ((239 8192) >> 9) + 16) >> 5 = 375,
    // not clamped (stored 119); chroma (8160 + 2032 + 16) >> 5 = 319, clamped.
    {"SA fast whole leaves luma unclamped, clamps chroma", Family::SA, &kYuy2, 2, kWholePair, false, 2, 4096, false,
     8192, {8160, 8160, 8160, 0}, {255, 255, 255, 0}, 0, {119, 255, 255, 0}, 0},
    // Fast partial overlay, c14 6144, e = (8192 6144 + 256) >> 9 = 98304:
    // luma ((239 425984 + 7648 6144 + 0x40000) >> 19) + 16 = 300 (stored 44);
    // chroma ((127 425984 + 4064 6144 + 0x40000) >> 19) + 128 = 279, clamped.
    {"SA fast partial overlay leaves luma unclamped", Family::SA, &kYuy2, 4, kPartialEven, false, 2, 4096, false, 8192,
     {8160, 8160, 8160, 0}, {255, 255, 255, 0}, 0, {44, 255, 255, 0}, 0},
    // RGBQ fast whole: (8160 + ((255 8192) >> 9) + 16) >> 5 = 383 on all four,
    // none clamped (stored 127).
    {"RGBQ SA fast whole clamps nothing", Family::SA, &kRgbq, 3, kWholePair, false, 2, 4096, false, 8192,
     {8160, 8160, 8160, 8160}, {255, 255, 255, 255}, 0, {127, 127, 127, 127}, 0},
    // RGBQ fast overlay: ((255 425984 + 8160 6144 + 0x40000) >> 19) = 303, not
    // clamped (47).
    {"RGBQ SA fast overlay clamps nothing", Family::SA, &kRgbq, 5, kPartialEven, false, 2, 4096, false, 8192,
     {8160, 8160, 8160, 8160}, {255, 255, 255, 255}, 0, {47, 47, 47, 47}, 0},
    // RGBQ fast tile: 255 + ((8160 6144 + 0x40000) >> 19) = 351, clamped.
    {"RGBQ SA fast tile clamps", Family::SA, &kRgbq, 5, kPartialEven, true, 2, 4096, false, 8192,
     {8160, 8160, 8160, 8160}, {255, 255, 255, 255}, 0, {255, 255, 255, 255}, 0},
    // W210 fast whole, m = 8192: luma (3203 + ((636 8192) >> 11) + 4) >> 3 = 718,
    // Cb (4100 - 848 + 4) >> 3 = 407, Cr (5000 + 1552 + 4) >> 3 = 819.
    {"W210 SA fast whole", Family::SA, &kW210, 3, kWholePair, false, 2, 4096, false, 8192, {3203, 4100, 5000, 0},
     {700, 300, 900, 0}, 0, {718, 407, 819, 0}, 0},

    // _SA_DA tile, straight destination, A 2048: the straight colour is
    // stored: ((S - o) 4096) / 2048 + o: 184, 72, 172.
    {"SA_DA straight tile stores the straight colour", Family::SA_DA, &kYuy2, 3, kWholePair, true, 1, 4096, false,
     8192, {3200, 3200, 4800, 0}, {60, 200, 30, 0}, 1000, {184, 72, 172, 0}, 2048},
    // Overshoot to A 4200 (line_a 16800): alpha 4096, luma (184 4096) / 4200 +
    // 16 = 195, chroma unreduced.
    {"SA_DA overshoot reduces luma only", Family::SA_DA, &kYuy2, 3, kWholePair, false, 2, 4096, false, 16800,
     {6400, 3200, 4800, 0}, {60, 200, 30, 0}, 1000, {195, 100, 150, 0}, 4096},
    // Overlay, straight destination: d = (2048 1000 + 2048) >> 12 = 500,
    // t = 2548; luma (44 500 + (84 << 12)) / 2548 + 16 = 159; Cb (72 500 - 28
    // 4096) / 2548 = -30 (toward zero) + 128 = 98; Cr (-98 500 + 22 4096) / 2548
    // = 16, + 128 = 144.
    {"SA_DA straight overlay truncates toward zero", Family::SA_DA, &kYuy2, 3, kWholePair, false, 1, 4096, false,
     8192, {3200, 3200, 4800, 0}, {60, 200, 30, 0}, 1000, {159, 98, 144, 0}, 2548},
    // Tile, premultiplied, level 3000: a = (2048 3000 + 2048) >> 12 = 1500;
    // luma ((84 3000 + 2048) >> 12) + 16 = 78; Cb ((-28 3000 + 2048) >> 12) +
    // 128 = -21 + 128 = 107; Cr ((22 3000 + 2048) >> 12) + 128 = 144.
    {"SA_DA premultiplied tile at level 3000", Family::SA_DA, &kYuy2, 3, kWholePair, true, 2, 3000, false, 8192,
     {3200, 3200, 4800, 0}, {60, 200, 30, 0}, 1000, {78, 107, 144, 0}, 1500},

    // H_ALPHA: a whole pixel in tile mode is overwritten with A; a partial one
    // adds e = (1536 2048 + 2048) >> 12 = 768.
    {"ALPHA tile whole pixel overwrites", Family::ALPHA, &kYuy2, 3, kWholePair, true, 2, 4096, false, 8192, {},
     {}, 1000, {}, 2048},
    {"ALPHA tile partial pixel adds", Family::ALPHA, &kYuy2, 3, kPartialEven, true, 2, 4096, false, 8192, {}, {},
     1000, {}, 1768},
    // A 4500 over 1000: linear ((-404 1000 + 2048) >> 12) + 4500 = 4401; a bank
    // limits a whole pixel to 4096.
    {"ALPHA linear overshoot is not limited", Family::ALPHA, &kYuy2, 3, kWholePair, false, 2, 4096, false, 18000, {},
     {}, 1000, {}, 4401},
    {"ALPHA bank overshoot is limited", Family::ALPHA, &kYuy2, 5, kWholePair, false, 2, 4096, false, 18000, {}, {},
     1000, {}, 4096},
    // At level 2048 a bank takes e = L for A above 4096; linear
    // (4500 2048 + 2048) >> 12 = 2250.
    {"ALPHA bank overshoot at level 2048", Family::ALPHA, &kYuy2, 6, kWholePair, true, 2, 2048, false, 18000, {}, {},
     1000, {}, 2048},
    {"ALPHA linear overshoot at level 2048", Family::ALPHA, &kYuy2, 3, kWholePair, true, 2, 2048, false, 18000, {}, {},
     1000, {}, 2250},
    // Tile partial sums are 16-bit: 65000 + 768 wraps to 232.
    {"ALPHA tile partial sum wraps at 16 bits", Family::ALPHA, &kYuy2, 2, kPartialEven, true, 2, 4096, false, 8192, {},
     {}, 65000, {}, 232},
};

TEST(AlphaComposition, HandWorkedPixels)
{
    for (const Worked& w : kWorked) {
        SCOPED_TRACE(w.what);
        const Fmt& f = w.fam == Family::ALPHA ? kAlphaOnly : *w.f;
        Rig r(f);
        const Geometry g = geometry(w.geo);
        r.c.level = w.level;
        r.c.tile = w.tile;
        r.c.dst_assoc = uint8_t(w.assoc);
        r.c.clamp = w.clamp;
        r.c.vcover = g.vcover;
        r.s.phase = w.slot == 2 ? 0 : 16 << 16;
        r.s.x = g.x;
        r.s.first_cover = g.first_cover;
        r.s.width16 = g.width16;
        r.fill_buffer(w.b, w.a13);
        for (int e = 0; w.fam != Family::ALPHA && e < r.elems(); ++e) r.set(e, w.d[r.kind(e)]);
        for (auto& a : r.dalpha) a = uint16_t(w.da);
        r.run(w.fam, w.slot);

        const int x = g.x;
        EXPECT_EQ(r.dalpha[size_t(x)], w.want_da);
        if (w.fam == Family::ALPHA) continue;
        if (f.pairs) {
            EXPECT_EQ(r.get(2 * x), w.want[0]) << "luma";
            EXPECT_EQ(r.get(2 * (x & ~1) + 1), w.want[1]) << "Cb";
            EXPECT_EQ(r.get(2 * (x & ~1) + 3), w.want[2]) << "Cr";
        } else {
            for (int e = 0; e < 4; ++e) EXPECT_EQ(r.get(4 * x + e), w.want[e]) << "sample " << e;
        }
    }
}

// The fast form's area luma from two samples is (s0 r + s1 (0x10000 - r)) >>
// 16 with no rounding term; its chroma from two samples keeps its rounding
// term. With w = 0xC000 the first pixel takes 3/4 of sample 0 and 1/4 of
// sample 1: luma (3 3215 + 3217) / 4 = 3215.5 truncates to 3215, and
// (3215 + 16) >> 5 = 100 where rounding would give 101. Its chroma span
// starts at v = 0x6000 - 0x8000 < 0, so r2 = 0x1A000: (4111 0x1A000 + 4114
// 0x6000 + 0x10000) >> 17 = 4112, and (4112 + 16) >> 5 = 129.
TEST(AlphaComposition, FastAreaTwoSampleLumaTruncates)
{
    struct Depth {
        const Fmt* f;
        int32_t s0, s1, want_luma, want_chroma;
    };
    // W210: (3 3203 + 3205) / 4 = 3203.5 truncates to 3203, (3203 + 4) >> 3 = 400;
    // chroma (4112 + 4) >> 3 = 514.
    for (const Depth& t : {Depth{&kYuy2, 3215, 3217, 100, 129}, Depth{&kW210, 3203, 3205, 400, 514}}) {
        SCOPED_TRACE(t.f->name);
        Rig r(*t.f);
        r.c.hstep = 0xC000;
        r.s.phase = 0;
        r.s.x = 0;
        r.s.first_cover = 0x10000;
        r.s.width16 = 0x20000;
        const int32_t flat[4] = {t.s1, 4114, 4114, 0};
        r.fill_buffer(flat, 16384);
        r.c.line[0] = int16_t(t.s0);
        r.c.line[1] = 4111;
        r.c.line[3] = 4111;
        r.run(Family::SA, hslot::area);
        EXPECT_EQ(r.get(0), t.want_luma);
        EXPECT_EQ(r.get(1), t.want_chroma);
        EXPECT_EQ(r.get(3), t.want_chroma);

        // The general form (here with clamp set) rounds its sum: for 8 bits
        // (3215.5 + 16) / 32 still gives 100; for 10 bits (3203.5 + 4) / 8 gives 400.
        Rig g(*t.f);
        g.c.hstep = 0xC000;
        g.c.clamp = 1;
        g.s = r.s;
        g.fill_buffer(flat, 16384);
        g.c.line[0] = int16_t(t.s0);
        g.c.line[1] = 4111;
        g.c.line[3] = 4111;
        g.run(Family::SA, hslot::area);
        EXPECT_EQ(g.get(0), t.want_luma);
    }
}

// Hand-worked constant regions.
TEST(AlphaComposition, ConstantRegionsHandWorked)
{
    // Truncation: 3231 >> 5 = 100 (rounding would give 101), 8175 >> 5 = 255,
    // -20 >> 5 = -1, clamped to 0; 10 bits 3231 >> 3 = 403. The second pixel of
    // the left region is wholly covered: with c12 4096 it takes S.
    {
        Rig r(kYuy2);
        r.c.dst_assoc = 2;
        r.s.pad_left = 4;
        r.s.left_x = 0;
        r.s.left_first_cover = 0x8000;
        r.s.left_width16 = 0x28000;
        const int32_t b[4] = {3231, 8175, -20, 0};
        r.fill_buffer(b, 0);
        r.run(Family::DA, hslot::left);
        EXPECT_EQ(r.get(2), 100);
        EXPECT_EQ(r.get(4), 100);
        EXPECT_EQ(r.get(5), 255);
        EXPECT_EQ(r.get(7), 0);
        Rig w(kW210);
        w.c.dst_assoc = 2;
        w.s = r.s;
        w.fill_buffer(b, 0);
        w.run(Family::DA, hslot::left);
        EXPECT_EQ(w.get(2), 403);
        EXPECT_EQ(w.get(5), 1021);  // 8175 >> 3
    }
    // _SA above 16384: luma (184 16384) / 18000 + 16 = 183 and A 16384, so the
    // whole second pixel takes 183; chroma keeps 100.
    {
        Rig r(kYuy2);
        r.s.pad_left = 4;
        r.s.left_x = 0;
        r.s.left_first_cover = 0x8000;
        r.s.left_width16 = 0x28000;
        const int32_t b[4] = {6400, 3200, 3200, 0};
        r.fill_buffer(b, 18000);
        r.run(Family::SA, hslot::left);
        EXPECT_EQ(r.get(2), 183);
        EXPECT_EQ(r.get(4), 183);
        EXPECT_EQ(r.get(5), 100);
        EXPECT_EQ(r.get(7), 100);
    }
    // _SA_DA does not clamp its samples: luma 8800 >> 5 = 275 in tile,
    // premultiplied, c = e = 2048 on the first pixel: 16 + ((259 2048 + 2048)
    // >> 12) = 146 (a clamped 255 would give 136, as _SA gives).
    {
        Rig r(kYuy2);
        r.c.tile = 1;
        r.c.dst_assoc = 2;
        r.s.pad_left = 4;
        r.s.left_x = 0;
        r.s.left_first_cover = 0x8000;
        r.s.left_width16 = 0x8000;
        const int32_t b[4] = {8800, 4096, 4096, 0};
        r.fill_buffer(b, 16384);
        for (int e = 0; e < r.elems(); ++e) r.set(e, r.kind(e) ? 128 : 16);
        std::fill(r.dalpha.begin(), r.dalpha.end(), uint16_t(0));
        Rig s(kYuy2);
        s.c.tile = 1;
        s.s = r.s;
        s.fill_buffer(b, 16384);
        for (int e = 0; e < s.elems(); ++e) s.set(e, s.kind(e) ? 128 : 16);
        r.run(Family::SA_DA, hslot::left);
        s.run(Family::SA, hslot::left);
        EXPECT_EQ(r.get(0), 146);
        EXPECT_EQ(r.dalpha[0], 2048);
        EXPECT_EQ(s.get(0), 136);
    }
    // H_ALPHA carries A: a region of two pixels with c12 2048 and then 4096 and
    // source alpha 4096 takes A = 2048 for both.
    for (bool tile : {false, true}) {
        Rig r(kAlphaOnly);
        r.c.tile = tile;
        r.s.pad_left = 4;
        r.s.left_x = 0;
        r.s.left_first_cover = 0x8000;
        r.s.left_width16 = 0x18000;
        const int32_t none[4] = {};
        r.fill_buffer(none, 16384);
        std::fill(r.dalpha.begin(), r.dalpha.end(), uint16_t(tile ? 100 : 0));
        r.run(Family::ALPHA, hslot::left);
        EXPECT_EQ(r.dalpha[0], tile ? 2148 : 2048);
        EXPECT_EQ(r.dalpha[1], tile ? 2148 : 2048);
        EXPECT_EQ(r.dalpha[2], tile ? 100 : 0);
    }
    // The RGBQ _SA tile region runs on its unclamped sums. c14 = 8192 (half
    // line), A 16384, S = 100, 30, 200, 250 over 50, 10, 100 and 200 / 0 / 0:
    //   pixel 0: 50 + 50 = 100, 10 + 15 = 25, 100 + 100 = 200, 200 + 125 = 325 (255)
    //   pixel 1: 50 + 50, 10 + ((25 8192 + 8192) >> 14) = 23, 200, 0 + 163
    //   pixel 2: 100, 10 + 12 = 22, 200, 0 + ((163 8192 + 8192) >> 14) = 82
    // The YUY2 _SA region does not: each pixel adds the same S.
    {
        Rig r(kRgbq);
        r.c.tile = 1;
        r.c.vcover = 8192;
        r.s.pad_left = 4;
        r.s.left_x = 0;
        r.s.left_first_cover = 0x10000;
        r.s.left_width16 = 0x30000;
        const int32_t b[4] = {3200, 960, 6400, 8000};
        r.fill_buffer(b, 16384);
        const int d[3][4] = {{50, 10, 100, 200}, {50, 10, 100, 0}, {50, 10, 100, 0}};
        for (int x = 0; x < 3; ++x)
            for (int e = 0; e < 4; ++e) r.set(4 * x + e, d[x][e]);
        r.run(Family::SA, hslot::left);
        const int want[3][4] = {{100, 25, 200, 255}, {100, 23, 200, 163}, {100, 22, 200, 82}};
        for (int x = 0; x < 3; ++x)
            for (int e = 0; e < 4; ++e) EXPECT_EQ(r.get(4 * x + e), want[x][e]) << "pixel " << x << " sample " << e;

        Rig y(kYuy2);
        y.c.tile = 1;
        y.c.vcover = 8192;
        y.s = r.s;
        const int32_t yb[4] = {3200, 4096, 4096, 0};
        y.fill_buffer(yb, 16384);
        for (int e = 0; e < y.elems(); ++e) y.set(e, y.kind(e) ? 128 : 50);
        y.run(Family::SA, hslot::left);
        for (int x = 0; x < 3; ++x) EXPECT_EQ(y.get(2 * x), 50 + 42) << "pixel " << x;  // (84 8192 + 8192) >> 14
    }
}

}  // namespace
}  // namespace lorvex
