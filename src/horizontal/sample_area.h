// The area sampler (slot 2): each destination pixel is the exact box average
// of the buffer samples under it.
//
// Units: `hstep` (w) is the width of one buffer sample in destination 16.16
// units (at least 128), and the strip's `phase` is where the first destination
// pixel begins on that scale, so sample n occupies [n w, (n + 1) w). There is
// no position per pixel: the walk keeps the width r still unused of the
// current sample, so no error builds up along a line.
//
// Luma: every destination pixel consumes exactly 0x10000 of width, whatever
// its coverage (coverage weighs the result, not the span); the weights n sum
// to 0x10000 and S = (sum + half) >> (16 + buffer shift).
//
// Chroma (4:2:2): chroma sample j is 2w wide and centred on even sample 2j, so
// its box runs from half a sample before that sample's start. The box of a
// destination pair runs from half a pixel before the even pixel's start:
// v = phase + w / 2, less 0x8000 when the strip's first pixel is even and
// plus 0x8000 when it is odd (the first chroma span then belongs to the next
// pixel). Index v / 2w and remainder r2 = 2w - v mod 2w by truncating
// division; a negative v makes the first chroma sample last longer. Even
// pixels consume 0x20000 of chroma width, odd pixels none.
//
// RGBQ: the four samples of a pixel share the luma walk.
#pragma once

#include "shared/isa.h"

#include "horizontal/pixel.h"
#include "horizontal/sample_units.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

template <class Units>
struct AreaSampler {
    using Dst = typename Units::Dst;
    static constexpr int taps = 0;
    static constexpr bool is_bank = false;

    const int16_t* line;
    const int16_t* line_a;
    int32_t w;
    int32_t p;   // current luma sample (pixel index)
    int32_t r;   // width of it still to use
    int32_t p2;  // current chroma pair
    int32_t r2;

    AreaSampler(const MapContext& c, const StripRecord& s, bool first_even)
        : line(c.line), line_a(c.line_a), w(c.hstep)
    {
        p = s.phase / w;
        r = w - s.phase % w;
        if constexpr (Dst::pairs) {
            const int32_t w2 = 2 * w;
            const int32_t v = s.phase + w / 2 + (first_even ? -0x8000 : 0x8000);
            p2 = v / w2;
            r2 = w2 - v % w2;
        } else {
            p2 = 0;
            r2 = 0;
        }
    }

    // One component of a walk: sample n of it stands at base[n * E], and its
    // sum starts at `bias`.
    struct Comp {
        const int16_t* base;
        int32_t E;
        int64_t bias;
        int64_t acc;
    };

    // Consumes `span` of width for every component, and moves the walk on.
    // Whole pixels may take two shortcuts, which give the loop's result when
    // one or two samples cover the span - except in the fast source-alpha
    // variant, whose colour from two samples has no rounding term, a result of
    // its own that is kept. Partly covered pixels always run the loop.
    template <int N>
    static void walk(Comp (&cs)[N], int32_t& p, int32_t& r, int32_t w, int32_t span, bool whole,
                     int truncated_pair)
    {
        if (whole && r >= span) {
            for (auto& c : cs) c.acc = int64_t(c.base[p * c.E]) * span + c.bias;
            r -= span;
            if (r == 0) {
                ++p;
                r = w;
            }
            return;
        }
        if (whole && r + w >= span) {
            for (auto& c : cs)
                c.acc = int64_t(c.base[p * c.E]) * r + int64_t(c.base[(p + 1) * c.E]) * (span - r) + c.bias;
            for (int e = 0; e < truncated_pair; ++e) cs[e].acc -= cs[e].bias;
            r += w - span;
            ++p;
            if (r == 0) {
                ++p;
                r = w;
            }
            return;
        }
        for (auto& c : cs) c.acc = c.bias;
        do {
            const int32_t n = r < span ? r : span;
            for (auto& c : cs) c.acc += int64_t(c.base[p * c.E]) * n;
            span -= n;
            r -= n;
            if (r == 0) {
                ++p;
                r = w;
            }
        } while (span != 0);
    }

    void sample(Px& px, bool with_chroma, bool whole = false)
    {
        constexpr int N = Dst::colour_samples;
        constexpr int E = Dst::pairs ? 2 : 4;
        constexpr int cs = Units::colour_shift;
        constexpr int M = N + (Units::alpha ? 1 : 0);
        Comp c[M];
        for (int e = 0; e < N; ++e) c[e] = {line + e, E, int64_t(1) << (15 + cs), 0};
        if constexpr (Units::alpha) c[N] = {line_a, 1, int64_t(1) << (15 + Units::alpha_shift), 0};
        walk<M>(c, p, r, w, 0x10000, whole, Units::truncated_pair_luma ? N : 0);
        for (int e = 0; e < N; ++e) px.s[e] = int32_t(c[e].acc >> (16 + cs));
        if constexpr (Units::alpha) px.a = int32_t(c[N].acc >> (16 + Units::alpha_shift));

        if constexpr (Dst::pairs) {
            if (!with_chroma) return;
            // Cb and Cr of pair j stand at elements 4j + 1 and 4j + 3.
            const int64_t bias = int64_t(1) << (16 + cs);
            Comp cc[2] = {{line + 1, 4, bias, 0}, {line + 3, 4, bias, 0}};
            walk<2>(cc, p2, r2, 2 * w, 0x20000, whole, 0);
            px.s[1] = int32_t(cc[0].acc >> (17 + cs));
            px.s[2] = int32_t(cc[1].acc >> (17 + cs));
        }
    }

    void advance() {}
};

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
