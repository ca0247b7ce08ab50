// Composition of the horizontal tables with alpha: _DA (source without alpha
// into a destination alpha plane), _SA (source alpha into a destination
// without; general form and the fast form in buffer units), _SA_DA (both
// sides) and the alpha-only table, for YUY2, W210 and RGBQ.
//
// Every filter reproduces a constant, so on a constant line buffer each main
// kernel hands its family the same S (and A) at every pixel. The table below
// works one pixel per rule row by hand, with values where a wrong rounding
// term, divisor, guard, clamp or row shows; the named tests pin the fast
// form's two-sample area luma and the constant regions (slots 0 and 1).
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <vector>

#include "horizontal/horizontal_kernels.h"
#include "shared/map_context.h"

namespace lorvex {
namespace {

enum Family { DA, SA, SADA, ALPHA };

struct Fmt {
    const HorizontalKernelTable* t[3];  // _DA, _SA, _SA_DA
    int bytes;
    bool pairs;
};
const Fmt kYuy2{{&H_YUY2_DA, &H_YUY2_SA, &H_YUY2_SA_DA}, 1, true};
const Fmt kW210{{&H_W210_DA, &H_W210_SA, &H_W210_SA_DA}, 2, true};
const Fmt kRgbq{{&H_RGBQ_DA, &H_RGBQ_SA, &H_RGBQ_SA_DA}, 1, false};
const Fmt kAlphaOnly{{&H_ALPHA, &H_ALPHA, &H_ALPHA}, 2, false};

// A bank whose every phase keeps a constant: two taps summing to 16384.
const std::array<int16_t, 256> kBank = [] {
    std::array<int16_t, 256> rows{};
    for (size_t ph = 0; ph < 16; ++ph) rows[ph * 16 + 7] = 6000, rows[ph * 16 + 8] = 10384;
    return rows;
}();

constexpr int kPixels = 12;

// One destination line (colour and alpha plane, both filled with 0x5A) and a
// line buffer. A 4:2:2 pixel x has luma at element 2x and its pair's Cb and
// Cr at 2(x & ~1) + 1 and + 3; RGBQ pixel x has 4x .. 4x + 3.
struct Rig {
    const Fmt& f;
    alignas(64) std::array<uint8_t, kPixels * 4 + 64> dst{};
    std::array<uint16_t, kPixels + 8> dalpha{};
    std::vector<int16_t> colour = std::vector<int16_t>(512, 0);
    std::vector<int16_t> alpha = std::vector<int16_t>(256, 0);
    MapContext c;
    StripRecord s{};

    // The left region paints pixels 0 (coverage 0x8000), 1 and 2 from buffer
    // pixel 4; the right region pixels 3, 4 and 5 (0x4000) from pixel 9.
    explicit Rig(const Fmt& fmt, bool tile = false, int assoc = 2) : f(fmt)
    {
        c.tile = tile;
        c.dst_assoc = uint8_t(assoc);
        s.pad_left = 4;
        s.last = 9;
        s.left_first_cover = 0x8000;
        s.left_width16 = 0x28000;
        s.right_x = 3;
        s.right_first_cover = 0x10000;
        s.right_width16 = 0x24000;
        c.line = colour.data() + 128;
        c.line_a = alpha.data() + 64;
        c.dst_line = dst.data();
        c.dst_line2 = reinterpret_cast<uint8_t*>(dalpha.data());
        c.hbank_y = c.hbank_c = kBank.data();
        c.hstep = 0x10000;
        c.vcover = 16384;
        std::fill(dst.begin(), dst.end(), uint8_t(0x5A));
        std::fill(dalpha.begin(), dalpha.end(), uint16_t(0x5A5A));
    }
    int elems() const { return f.pairs ? 2 * kPixels : 4 * kPixels; }
    int get(int e) const { return f.bytes == 1 ? dst[size_t(e)] : dst[size_t(2 * e)] | dst[size_t(2 * e + 1)] << 8; }
    void set(int e, int v)
    {
        dst[size_t(e * f.bytes)] = uint8_t(v);
        if (f.bytes == 2) dst[size_t(2 * e + 1)] = uint8_t(v >> 8);
    }
    // Kind of element e: 0 luma (RGBQ sample 0), 1 Cb, 2 Cr, 3 RGBQ sample 3.
    int kind(int e) const { return f.pairs ? (e % 2 == 0 ? 0 : e % 4 == 1 ? 1 : 2) : e % 4; }
    // The colour plane at one value per kind, the alpha plane at da.
    void fill_dst(const std::array<int32_t, 4>& d, int32_t da)
    {
        for (int e = 0; e < elems(); ++e) set(e, d[size_t(kind(e))]);
        std::fill(dalpha.begin(), dalpha.end(), uint16_t(da));
    }
    // The whole buffer at one value per kind; alpha everywhere a13.
    void fill_buffer(const std::array<int32_t, 4>& b, int32_t a13)
    {
        for (int e = -64; e < 192; ++e)
            c.line[e] = int16_t(b[size_t(f.pairs ? (e & 1 ? ((e & 3) == 1 ? 1 : 2) : 0) : (e & 3))]);
        for (int i = -32; i < 64; ++i) c.line_a[i] = int16_t(a13);
    }
    std::vector<int> vals(std::initializer_list<int> es) const
    {
        std::vector<int> v;
        for (int e : es) v.push_back(get(e));
        return v;
    }
    std::vector<int> alphas(int n) const { return std::vector<int>(dalpha.begin(), dalpha.begin() + n); }
    void run(Family fam, int slot) { (*f.t[fam == ALPHA ? 0 : fam])[size_t(slot)](c, s); }
};

// Where the strip lies: WP a whole pair from pixel 0; PE a partly covered
// pixel 0 (0x6000: c12 1536, c14 6144 at level 4096); SO the odd pixel 1
// alone (the partial rule at full weight, luma only); ZL a whole pair on a
// line of coverage 1 (c = 0).
enum Geo { WP, PE, SO, ZL };

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
    int32_t a13;      // line_a
    int32_t da;       // destination alpha words
    int32_t want[4];  // luma, Cb, Cr of the pixel (RGBQ: its four samples), before the store
    int32_t want_da;
    std::array<int32_t, 4> b{3200, 3200, 4800, 0};  // buffer, per kind: S = 100, 100, 150
    std::array<int32_t, 4> d{60, 200, 30, 0};       // destination, per kind
};

// Notation: S stored sample (B + 16) >> 5 or (B + 4) >> 3; c the pixel's
// weight; o the offset (16 / 128, 64 / 512). Values beyond the range in
// `want` are the unclamped results, stored by their low bits.
const Worked kWorked[] = {
    // ---- _DA: S = 100, 100, 150 over 60, 200, 30.
    {"DA level 4096 replaces, alpha 4096", DA, &kYuy2, 3, WP, 0, 1, 4096, 0, 0, 1000, {100, 100, 150}, 4096},
    // ((84 3000 + 2048) >> 12) + 16 = 78; Cb -21 + 128 = 107; Cr 144.
    {"DA tile premultiplied whole", DA, &kYuy2, 3, WP, 1, 2, 3000, 0, 0, 1000, {78, 107, 144}, 3000},
    {"DA tile straight whole", DA, &kYuy2, 3, WP, 1, 1, 3000, 0, 0, 1000, {100, 100, 150}, 3000},
    // Dα ((1001 1096 + 2048) >> 12) + 3000 = 3268; (60 1096 + 100 3000 + 2048) >> 12 = 89.
    {"DA overlay premultiplied whole", DA, &kYuy2, 3, WP, 0, 2, 3000, 0, 0, 1001, {89, 127, 118}, 3268},
    // d = 268, t = 3268: (60 268 + 300000 + 1634) / 3268 = 97. dst_assoc 0 is straight.
    {"DA overlay straight whole", DA, &kYuy2, 3, WP, 0, 0, 3000, 0, 0, 1000, {97, 108, 140}, 3268},
    // S 275: (250 1096 + 275 3000 + 2048) / 4096 = 268, clamped.
    {"DA overlay straight whole clamps", DA, &kYuy2, 3, WP, 0, 1, 3000, 0, 0, 4096,
     {255, 127, 118}, 4096, {8800, 3200, 4800}, {250, 200, 30}},
    // t = 1000 + 1536: (60 1000 + 100 1536 + 1268) / 2536 = 84; chroma by t too.
    {"DA tile straight partial", DA, &kYuy2, 2, PE, 1, 1, 4096, 0, 0, 1000, {84, 139, 103}, 2536},
    // Dα ((1001 2560 + 2048) >> 12) + 1536 = 2162 (2161 without the rounding term).
    {"DA overlay premultiplied partial", DA, &kYuy2, 2, PE, 0, 2, 4096, 0, 0, 1001, {75, 163, 75}, 2162},
    // d = 625, t = 2161: (60 625 + 100 1536 + 1080) / 2161 = 88; Cb 129, Cr 115.
    {"DA overlay straight partial divides by the new alpha", DA, &kYuy2, 2, PE, 0, 1, 4096, 0, 0, 1000,
     {88, 129, 115}, 2161},
    {"DA overlay straight partial is not clamped", DA, &kYuy2, 2, PE, 0, 1, 4096, 0, 0, 4096,
     {259, 163, 75}, 4096, {8800, 3200, 4800}, {250, 200, 30}},
    // 200 + ((239 4096 + 2048) >> 12) = 439 (stored 183); Dα adds past 4096.
    {"DA premultiplied tile partial adds, unclamped", DA, &kYuy2, 3, SO, 1, 2, 4096, 0, 0, 3000,
     {439, 90, 170}, 7096, {8160, 3200, 3200}, {200, 90, 170}},
    // c = 0 on a line of coverage 1 over Dα 0: the straight rows write nothing.
    {"DA straight tile, c 0", DA, &kYuy2, 3, ZL, 1, 1, 4096, 0, 0, 0, {60, 200, 30}, 0},
    {"DA straight overlay, c 0", DA, &kYuy2, 3, ZL, 0, 1, 4096, 0, 0, 0, {60, 200, 30}, 0},
    {"W210 DA overlay straight partial", DA, &kW210, 2, PE, 0, 1, 4096, 0, 0, 1000,
     {354, 516, 461}, 2161, {3200, 3200, 4800}, {240, 800, 120}},
    {"RGBQ DA overlay premultiplied whole", DA, &kRgbq, 3, WP, 0, 2, 3000, 0, 0, 1001,
     {89, 127, 118, 186}, 3268, {3200, 3200, 4800, 8000}, {60, 200, 30, 10}},

    // ---- _SA general form (clamp set, another level, or slot 6 and up).
    // ((44 8192 + 8192) >> 14) + 100 = 122; Cb 36 + 100 = 136; Cr -49 + 150 = 101.
    {"SA whole", SA, &kYuy2, 3, WP, 0, 2, 4096, 1, 8192, 0, {122, 136, 101}, 0},
    {"SA alpha 0 writes nothing", SA, &kYuy2, 3, WP, 0, 2, 4096, 1, 0, 0, {60, 200, 30}, 0},
    {"SA alpha 1 draws", SA, &kYuy2, 3, WP, 0, 2, 4096, 1, 1, 0, {144, 172, 52}, 0},
    // A 18000: luma (184 16384) / 18000 + 16 = 183; chroma keeps A:
    // ((72 (-1616) + 8192) >> 14) + 100 = 93, Cr 160.
    {"SA above 1.0 brings luma back, not chroma", SA, &kYuy2, 3, WP, 0, 2, 4096, 1, 18000, 0,
     {183, 93, 160}, 0, {6400, 3200, 4800}},
    {"SA whole at level 3000", SA, &kYuy2, 3, WP, 0, 2, 3000, 0, 12000, 0, {98, 141, 99}, 0},
    {"SA whole at level 3000 above 1.0", SA, &kYuy2, 3, WP, 0, 2, 3000, 0, 18000, 0,
     {150, 127, 118}, 0, {6400, 3200, 4800}},
    // c14 4500, e = 3296: ((44 13088 + 84 4500 + 8192) >> 14) + 16 = 74.
    {"SA partial overlay at level 3000", SA, &kYuy2, 5, PE, 0, 2, 3000, 0, 12000, 0, {74, 178, 56}, 0},
    {"SA partial overlay above 1.0", SA, &kYuy2, 5, PE, 0, 2, 3000, 0, 18000, 0, {94, 173, 63}, 0, {6400, 3200, 4800}},
    {"SA partial tile", SA, &kYuy2, 3, PE, 1, 2, 4096, 1, 12000, 0, {92, 190, 38}, 0},
    {"SA partial tile above 1.0", SA, &kYuy2, 3, PE, 1, 2, 4096, 1, 18000, 0, {123, 190, 38}, 0, {6400, 3200, 4800}},
    {"SA slot 6 is general and clamps luma", SA, &kYuy2, 6, WP, 0, 2, 4096, 0, 8192, 0,
     {255, 255, 255}, 0, {8160, 8160, 8160}, {255, 255, 255}},
    {"RGBQ SA above 1.0 brings back every sample", SA, &kRgbq, 3, WP, 0, 2, 4096, 1, 18000, 0,
     {182, 91, 136, 227}, 0, {6400, 3200, 4800, 8000}, {60, 200, 30, 10}},

    // ---- _SA fast form (clamp 0, level 4096, slots 2 to 5).
    // (3230 + 0 + 16) >> 5 = 101 would need the rounding term; (3214 + 16) >> 5 = 100.
    {"SA fast whole at alpha 1.0 is S", SA, &kYuy2, 3, WP, 0, 2, 4096, 0, 16384, 0,
     {100, 100, 150}, 0, {3214, 3214, 4814}},
    {"SA fast alpha 0 writes nothing", SA, &kYuy2, 2, WP, 0, 2, 4096, 0, 0, 0, {60, 200, 30}, 0},
    // m 8192: (8160 + ((239 8192) >> 9) + 16) >> 5 = 375 unclamped; chroma 319, clamped.
    {"SA fast whole clamps chroma only", SA, &kYuy2, 2, WP, 0, 2, 4096, 0, 8192, 0,
     {375, 255, 255}, 0, {8160, 8160, 8160}, {255, 255, 255}},
    // e = (8192 6144 + 256) >> 9 = 98304: ((239 425984 + 7648 6144 + 0x40000) >> 19) + 16 = 300.
    {"SA fast partial overlay clamps chroma only", SA, &kYuy2, 4, PE, 0, 2, 4096, 0, 8192, 0,
     {300, 255, 255}, 0, {8160, 8160, 8160}, {255, 255, 255}},
    // 100 + ((2703 6144 + 0x40000) >> 19) = 132; Cr 100 + 2 = 102.
    {"SA fast partial tile", SA, &kYuy2, 4, PE, 1, 2, 4096, 0, 8192, 0,
     {132, 100, 102}, 0, {3215, 4111, 4300}, {100, 100, 100}},
    // 10 bits: (3203 + ((636 8192) >> 11) + 4) >> 3 = 718; Cb (4100 - 848 + 4) >> 3 = 407.
    {"W210 SA fast whole", SA, &kW210, 3, WP, 0, 2, 4096, 0, 8192, 0,
     {718, 407, 819}, 0, {3203, 4100, 5000}, {700, 300, 900}},
    {"W210 SA fast partial overlay", SA, &kW210, 3, PE, 0, 2, 4096, 0, 5000, 0,
     {753, 324, 898}, 0, {3203, 4100, 5000}, {700, 300, 900}},
    // RGBQ: no offsets, clamped only in tile: 383, 303 unclamped; tile 351 clamped.
    {"RGBQ SA fast whole", SA, &kRgbq, 3, WP, 0, 2, 4096, 0, 8192, 0,
     {383, 383, 383, 383}, 0, {8160, 8160, 8160, 8160}, {255, 255, 255, 255}},
    {"RGBQ SA fast overlay", SA, &kRgbq, 5, PE, 0, 2, 4096, 0, 8192, 0,
     {303, 303, 303, 303}, 0, {8160, 8160, 8160, 8160}, {255, 255, 255, 255}},
    {"RGBQ SA fast tile clamps", SA, &kRgbq, 5, PE, 1, 2, 4096, 0, 8192, 0,
     {255, 255, 255, 255}, 0, {8160, 8160, 8160, 8160}, {255, 255, 255, 255}},

    // ---- _SA_DA, A = (line_a + 2) >> 2.
    // A 4200: Dα 4096, luma (184 4096) / 4200 + 16 = 195, chroma as it is.
    {"SA_DA above 1.0 reduces luma only", SADA, &kYuy2, 3, WP, 0, 2, 4096, 0, 16800, 1000,
     {195, 100, 150}, 4096, {6400, 3200, 4800}},
    {"SA_DA tile premultiplied", SADA, &kYuy2, 3, WP, 1, 2, 4096, 0, 8192, 1000, {100, 100, 150}, 2048},
    // (84 4096) / 2048 + 16 = 184, 72, 172.
    {"SA_DA tile straight stores the straight colour", SADA, &kYuy2, 3, WP, 1, 1, 4096, 0, 8192, 1000,
     {184, 72, 172}, 2048},
    {"SA_DA overlay premultiplied", SADA, &kYuy2, 3, WP, 0, 2, 4096, 0, 8192, 1001, {122, 136, 101}, 2549},
    // d = 500, t = 2548: (44 500 + (84 << 12)) / 2548 + 16 = 159; Cb -30 (toward zero) + 128.
    {"SA_DA overlay straight truncates toward zero", SADA, &kYuy2, 3, WP, 0, 1, 4096, 0, 8192, 1000,
     {159, 98, 144}, 2548},
    // a = 1500: ((84 3000 + 2048) >> 12) + 16 = 78.
    {"SA_DA tile premultiplied at level 3000", SADA, &kYuy2, 3, WP, 1, 2, 3000, 0, 8192, 1000, {78, 107, 144}, 1500},
    {"SA_DA tile straight at level 3000", SADA, &kYuy2, 3, WP, 1, 1, 3000, 0, 8192, 1000, {184, 72, 172}, 1500},
    // a = L; luma r + o = 195; chroma ((S - o) L) / L + o.
    {"SA_DA tile straight at level 3000 above 1.0", SADA, &kYuy2, 3, WP, 1, 1, 3000, 0, 16800, 1000,
     {195, 100, 150}, 3000, {6400, 3200, 4800}},
    {"SA_DA overlay premultiplied at level 3000", SADA, &kYuy2, 3, WP, 0, 2, 3000, 0, 8192, 1001, {105, 153, 82}, 2134},
    {"SA_DA overlay straight at level 3000", SADA, &kYuy2, 3, WP, 0, 1, 3000, 0, 8192, 1000, {147, 111, 129}, 2134},
    {"SA_DA overlay straight at level 3000 above 1.0", SADA, &kYuy2, 3, WP, 0, 1, 3000, 0, 16800, 1000,
     {183, 109, 140}, 3268, {6400, 3200, 4800}},
    // c 1536, e 768: Dα 3000 + 768; 60 + ((84 1536 + 2048) >> 12) = 92.
    {"SA_DA partial tile premultiplied", SADA, &kYuy2, 3, PE, 1, 2, 4096, 0, 8192, 3000, {92, 190, 38}, 3768},
    // (44 1000 + 84 1536) / 1768 + 16 = 113.
    {"SA_DA partial tile straight", SADA, &kYuy2, 3, PE, 1, 1, 4096, 0, 8192, 1000, {113, 144, 92}, 1768},
    {"SA_DA partial overlay premultiplied", SADA, &kYuy2, 3, PE, 0, 2, 4096, 0, 8192, 1001, {83, 176, 57}, 1581},
    {"SA_DA partial overlay straight", SADA, &kYuy2, 3, PE, 0, 1, 4096, 0, 8192, 1000, {120, 137, 99}, 1581},
    {"SA_DA partial overlay straight above 1.0", SADA, &kYuy2, 3, PE, 0, 1, 4096, 0, 16800, 1000,
     {155, 128, 116}, 2161, {6400, 3200, 4800}},
    // A 1, e 0, Dα 0: the new Dα is 0, so luma ((44 4096 + 84 1536 + 2048) >> 12) + 16
    // = 92 is written and chroma is not; straight rows with e 0 write nothing.
    {"SA_DA chroma needs a new alpha", SADA, &kYuy2, 3, PE, 0, 2, 4096, 0, 4, 0, {92, 200, 30}, 0},
    {"SA_DA straight tile, e 0", SADA, &kYuy2, 3, PE, 1, 1, 4096, 0, 4, 0, {60, 200, 30}, 0},
    {"SA_DA line_a 1 is alpha 0", SADA, &kYuy2, 3, WP, 0, 2, 4096, 0, 1, 1000, {60, 200, 30}, 1000},
    {"W210 SA_DA overlay straight at level 3000", SADA, &kW210, 3, WP, 0, 1, 3000, 0, 8192, 1000,
     {588, 441, 519}, 2134, {3200, 3200, 4800}, {240, 800, 120}},
    {"RGBQ SA_DA above 1.0 reduces every sample", SADA, &kRgbq, 3, WP, 0, 1, 4096, 0, 16800, 1000,
     {195, 97, 146, 243}, 4096, {6400, 3200, 4800, 8000}, {60, 200, 30, 10}},

    // ---- H_ALPHA: D the alpha word, A = (line_a + 2) >> 2; slots 4 and up are banks.
    {"ALPHA tile whole overwrites", ALPHA, &kAlphaOnly, 3, WP, 1, 2, 4096, 0, 8192, 1000, {}, 2048},
    // ((2048 1001 + 2048) >> 12) + 2048 = 2549 (2548 without the rounding term).
    {"ALPHA overlay whole", ALPHA, &kAlphaOnly, 3, WP, 0, 2, 4096, 0, 8192, 1001, {}, 2549},
    {"ALPHA overlay whole at level 3000", ALPHA, &kAlphaOnly, 3, WP, 0, 2, 3000, 0, 8192, 1001, {}, 2134},
    // e = (1536 2048 + 2048) >> 12 = 768.
    {"ALPHA tile partial adds", ALPHA, &kAlphaOnly, 3, PE, 1, 2, 4096, 0, 8192, 1000, {}, 1768},
    {"ALPHA overlay partial", ALPHA, &kAlphaOnly, 3, PE, 0, 2, 4096, 0, 8192, 1001, {}, 1581},
    // A 4500 over 1000: ((-404 1000 + 2048) >> 12) + 4500 = 4401; a bank gives 4096.
    {"ALPHA linear above 1.0 is not limited", ALPHA, &kAlphaOnly, 3, WP, 0, 2, 4096, 0, 18000, 1000, {}, 4401},
    {"ALPHA bank above 1.0 is limited", ALPHA, &kAlphaOnly, 5, WP, 0, 2, 4096, 0, 18000, 1000, {}, 4096},
    {"ALPHA bank above 1.0 at level 2048", ALPHA, &kAlphaOnly, 6, WP, 1, 2, 2048, 0, 18000, 1000, {}, 2048},
    {"ALPHA linear above 1.0 at level 2048", ALPHA, &kAlphaOnly, 3, WP, 1, 2, 2048, 0, 18000, 1000, {}, 2250},
    {"ALPHA tile partial sum wraps at 16 bits", ALPHA, &kAlphaOnly, 2, PE, 1, 2, 4096, 0, 8192, 65000, {}, 232},
    // A 1 at level 1000: e = 0, and a linear kernel writes nothing (tile would write 0).
    {"ALPHA e 0 writes nothing", ALPHA, &kAlphaOnly, 3, WP, 1, 2, 1000, 0, 4, 1000, {}, 1000},
    {"ALPHA line_a 1 writes nothing", ALPHA, &kAlphaOnly, 3, WP, 1, 2, 4096, 0, 1, 1000, {}, 1000},
};

TEST(AlphaComposition, HandWorkedPixels)
{
    struct Where {
        int32_t x, first_cover, width16, vcover;
    };
    const Where where[] = {{0, 0x10000, 0x20000, 16384}, {0, 0x6000, 0x6000, 16384}, {1, 0x10000, 0x10000, 16384},
                           {0, 0x10000, 0x20000, 1}};
    for (const Worked& w : kWorked) {
        SCOPED_TRACE(w.what);
        Rig r(*w.f, w.tile, w.assoc);
        const Where g = where[w.geo];
        r.c.level = w.level;
        r.c.clamp = w.clamp;
        r.c.vcover = g.vcover;
        r.s.phase = w.slot == 2 ? 0 : 16 << 16;
        r.s.x = g.x;
        r.s.first_cover = g.first_cover;
        r.s.width16 = g.width16;
        r.fill_buffer(w.b, w.a13);
        if (w.fam != ALPHA) r.fill_dst(w.d, 0);
        std::fill(r.dalpha.begin(), r.dalpha.end(), uint16_t(w.da));
        const auto before = r.dst;
        r.run(w.fam, w.slot);

        const int x = g.x, mask = w.f->bytes == 1 ? 0xFF : 0xFFFF;
        EXPECT_EQ(r.dalpha[size_t(x)], w.want_da);
        for (int p = 2; p < kPixels; ++p) EXPECT_EQ(r.dalpha[size_t(p)], w.da) << "alpha word of pixel " << p;
        if (w.fam == ALPHA) continue;
        int at[4] = {4 * x, 4 * x + 1, 4 * x + 2, 4 * x + 3};
        if (w.f->pairs) at[0] = 2 * x, at[1] = 2 * (x & ~1) + 1, at[2] = 2 * (x & ~1) + 3;
        for (int k = 0; k < (w.f->pairs ? 3 : 4); ++k) EXPECT_EQ(r.get(at[k]), w.want[k] & mask) << "sample " << k;
        // Nothing beyond the strip's pixels (and their pair's chroma) is touched.
        for (size_t i = size_t(2 * (w.f->pairs ? 2 : 4) * w.f->bytes); i < r.dst.size(); ++i)
            ASSERT_EQ(r.dst[i], before[i]) << "byte " << i;
    }
}

// The fast form's area luma from two samples is (s0 r + s1 (0x10000 - r)) >>
// 16 with no rounding term; its chroma keeps its rounding term. With hstep
// 0xC000 pixel 0 takes 3/4 of sample 0 and 1/4 of sample 1: luma
// (3 3215 + 3217) / 4 = 3215.5 truncates to 3215, and (3215 + 16) >> 5 = 100
// where rounding would give 101. Chroma starts at v = 0x6000 - 0x8000 < 0, so
// r2 = 0x1A000: (4111 0x1A000 + 4114 0x6000 + 0x10000) >> 17 = 4112, (4112 +
// 16) >> 5 = 129. W210: (3 3203 + 3205) / 4 = 3203.5 -> 3203, (3203 + 4) >> 3
// = 400; chroma (4112 + 4) >> 3 = 514. The general form (clamp set) rounds
// once: (3215.5 + 16) / 32 and (3203.5 + 4) / 8 still give 100 and 400.
TEST(AlphaComposition, FastAreaTwoSampleLumaTruncates)
{
    struct Depth {
        const Fmt* f;
        int32_t s0, s1, want_luma, want_chroma;
    };
    for (const Depth& t : {Depth{&kYuy2, 3215, 3217, 100, 129}, Depth{&kW210, 3203, 3205, 400, 514}})
        for (int clamp : {0, 1}) {
            SCOPED_TRACE(t.f->bytes == 1 ? "YUY2" : "W210");
            Rig r(*t.f);
            r.c.hstep = 0xC000;
            r.c.clamp = uint8_t(clamp);
            r.s.first_cover = 0x10000;
            r.s.width16 = 0x20000;
            r.fill_buffer({t.s1, 4114, 4114, 0}, 16384);
            r.c.line[0] = int16_t(t.s0);
            r.c.line[1] = r.c.line[3] = 4111;
            r.run(SA, hslot::area);
            EXPECT_EQ(r.get(0), t.want_luma);
            if (clamp) continue;
            EXPECT_EQ(r.get(1), t.want_chroma);
            EXPECT_EQ(r.get(3), t.want_chroma);
        }
}

// Constant regions: the samples are read by truncation (no rounding term) and
// every pixel takes the family's partial rule with its own weight.
TEST(AlphaComposition, ConstantRegions)
{
    using V = std::vector<int>;
    // _DA limits its samples: 3231 >> 5 = 100 (rounding would give 101), 8800 >> 5
    // = 275 -> 255, -20 >> 5 = -1 -> 0. Overlay, premultiplied, Dα 1000: pixel 0
    // (c 2048) (60 2048 + 100 2048 + 2048) >> 12 = 80, Dα 2548; pixels 1 and 2 take
    // S. W210: 403, 1023, 0, pixel 0 (240 2048 + 403 2048 + 2048) >> 12 = 322.
    for (const Fmt* f : {&kYuy2, &kW210}) {
        const bool ten = f == &kW210;
        Rig r(*f, 0, 2);
        r.fill_buffer({3231, 8800, -20, 0}, 0);
        r.fill_dst({ten ? 240 : 60, ten ? 800 : 200, ten ? 120 : 30, 0}, 1000);
        r.run(DA, hslot::left);
        EXPECT_EQ((r.vals({0, 1, 2, 4, 5, 7})), (ten ? V{322, 912, 403, 403, 1023, 0} : V{80, 228, 100, 100, 255, 0}));
        EXPECT_EQ(r.alphas(4), (V{2548, 4096, 4096, 1000}));
    }
    // The right region reads its pair's chroma before its luma: buffer pixel 9
    // holds luma at 18, Cb at 17 and Cr at 19. Tile, straight, over Dα 1000:
    // pixels 3 and 4 (c 4096) t = 5096, (60 1000 + 100 4096 + 2548) / 5096 = 92;
    // Cb (200 1000 + 93 4096 + 2548) / 5096 = 114; pixel 5 (c 1024) 80, Dα 2024.
    {
        Rig r(kYuy2, 1, 1);
        r.fill_buffer({5555, 2222, 7777, 0}, 0);
        r.c.line[18] = 3231;
        r.c.line[17] = 3000;
        r.c.line[19] = 5000;
        r.fill_dst({60, 200, 30, 0}, 1000);
        r.run(DA, hslot::right);
        EXPECT_EQ((r.vals({4, 6, 8, 9, 10, 11})), (V{60, 92, 92, 114, 80, 131}));
        EXPECT_EQ(r.alphas(6), (V{1000, 1000, 1000, 5096, 5096, 2024}));
    }
    // _SA above 16384: luma (184 16384) / 18000 + 16 = 183 and A 16384, so the
    // whole pixels 1 and 2 take 183; chroma keeps 100. Overlay mixes without
    // clamping: A 4096, S 255 over 250, pixel 0 (c 8192, e 2048) ((234 14336 +
    // 239 8192 + 8192) >> 14) + 16 = 340, pixel 1 431, stored 84 and 175.
    {
        Rig r(kYuy2, 0, 2), s(kYuy2, 0, 2);
        r.fill_buffer({6400, 3200, 3200, 0}, 18000);
        r.run(SA, hslot::left);
        EXPECT_EQ((r.vals({2, 4, 5})), (V{183, 183, 100}));
        s.fill_buffer({8160, 8160, 8160, 0}, 4096);
        s.fill_dst({250, 250, 250, 0}, 0);
        s.run(SA, hslot::left);
        EXPECT_EQ((s.vals({0, 2})), (V{340 & 0xFF, 431 & 0xFF}));
    }
    // _SA_DA neither rounds nor limits its samples at set-up: luma 8800 >> 5 = 275
    // in tile, premultiplied, c = e = 2048 on pixel 0: 16 + ((259 2048 + 2048) >>
    // 12) = 146 (a limited 255 gives 136, as _SA does). Above 1.0 (line_a 18000, A
    // 4500) luma comes back to (184 4096) / 4500 + 16 = 183 and A to 4096: 16 +
    // ((167 2048 + 2048) >> 12) = 100; chroma keeps S: 128 + ((-28 2048 + 2048) >> 12) = 114.
    // line_a 2 rounds to A 1: e = 1, Dα 1, luma 16 + ((184 2048 + 2048) >> 12) = 108.
    for (int32_t a13 : {16384, 18000, 2}) {
        Rig r(kYuy2, 1, 2), s(kYuy2, 1, 2);
        for (Rig* q : {&r, &s}) {
            q->s.left_width16 = 0x8000;
            q->fill_buffer({a13 == 16384 ? 8800 : 6400, 3200, 3200, 0}, a13);
            q->fill_dst({16, 128, 128, 0}, 0);
        }
        r.run(SADA, hslot::left);
        s.run(SA, hslot::left);
        EXPECT_EQ((r.vals({0, 1})), (V{a13 == 16384 ? 146 : a13 == 2 ? 108 : 100, 114}));
        EXPECT_EQ(r.dalpha[0], a13 == 2 ? 1 : 2048);
        if (a13 == 16384) {
            EXPECT_EQ(s.get(0), 136);
        }
    }
    // H_ALPHA carries A from pixel to pixel: c12 2048 and then 4096 with source
    // alpha 4096 (or 4500, limited to 4096) give A = 2048 for both pixels.
    for (int32_t a13 : {16384, 18000})
        for (bool tile : {false, true}) {
            Rig r(kAlphaOnly, tile, 2);
            r.s.left_width16 = 0x18000;
            r.fill_buffer({}, a13);
            std::fill(r.dalpha.begin(), r.dalpha.end(), uint16_t(tile ? 100 : 0));
            r.run(ALPHA, hslot::left);
            EXPECT_EQ(r.alphas(3), (tile ? V{2148, 2148, 100} : V{2048, 2048, 0}));
        }
    // The RGBQ _SA tile region runs on its unclamped sums. c14 8192 (half line),
    // A 16384, S = 100, 30, 200, 250 over 50, 10, 100 and 200 / 0 / 0:
    //   pixel 0: 100, 10 + 15 = 25, 200, 200 + 125 = 325 (255)
    //   pixel 1: 100, 10 + ((25 8192 + 8192) >> 14) = 23, 200, 0 + 163
    //   pixel 2: 100, 10 + 12 = 22, 200, 0 + ((163 8192 + 8192) >> 14) = 82
    // The YUY2 region does not: each pixel adds the same S, 50 + (84 8192 + 8192) >> 14.
    {
        Rig r(kRgbq, 1, 2), y(kYuy2, 1, 2);
        for (Rig* q : {&r, &y}) {
            q->c.vcover = 8192;
            q->s.left_first_cover = 0x10000;
            q->s.left_width16 = 0x30000;
        }
        r.fill_buffer({3200, 960, 6400, 8000}, 16384);
        r.fill_dst({50, 10, 100, 0}, 0);
        r.set(3, 200);
        r.run(SA, hslot::left);
        EXPECT_EQ(r.vals({0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11}),
                  (V{100, 25, 200, 255, 100, 23, 200, 163, 100, 22, 200, 82}));
        y.fill_buffer({3200, 4096, 4096, 0}, 16384);
        y.fill_dst({50, 128, 128, 0}, 0);
        y.run(SA, hslot::left);
        EXPECT_EQ((y.vals({0, 2, 4})), (V{92, 92, 92}));
    }
}

}  // namespace
}  // namespace lorvex
