// Composition of a source with alpha into a destination without (tables
// H_YUY2_SA, H_W210_SA, H_RGBQ_SA). The buffer holds premultiplied colour,
// so the rule is "over" with a premultiplied foreground: only the destination
// is weighted by one less alpha. S keeps its black and neutral offsets, so the
// weighted part is S - o. A is the source alpha in 1/16384; a pixel with A
// below 1 writes nothing (the walk goes on).
//
// General form, S in stored depth, c the 14-bit weight of a partly covered
// pixel. An A above 16384 (only an overshooting filter gives it) first brings
// the luma (every RGBQ sample) back to full opacity, s = ((S - o) 16384) / A + o;
// chroma keeps S and its A.
//
//   whole, L 4096, A <= 16384     clamp((((D - o)(16384 - A) + 8192) >> 14) + S)
//   whole, L 4096, A > 16384      luma clamp(s)
//   whole, L other, A <= 16384    e = (A L + 8192) >> 14:
//                                 clamp((((D - o)(4096 - e) + (S - o) L + 2048) >> 12) + o)
//   whole, L other, A > 16384     luma clamp((s L + (4096 - L) D + 2048) >> 12); chroma with e = L
//   partial overlay, A <= 16384   e = (c A + 8192) >> 14:
//                                 clamp((((D - o)(16384 - e) + (S - o) c + 8192) >> 14) + o)
//   partial overlay, A > 16384    luma clamp((s c + (16384 - c) D + 8192) >> 14); chroma with e = c
//   partial tile                  clamp(D + (((S - o) c + 8192) >> 14)); luma above 16384 with
//                                 ((S - o) 16384 / A) in place of S - o
//
// Fast form, used at `clamp` 0 and L 4096 in slots 2 to 5: colour stays in
// buffer units (S13), with m = 16384 - A and the shifts of an 8-bit
// destination (10 bits: >> 11, + 4, >> 3; 0x20000, 0x10000, >> 17):
//
//   whole                         D' = (S13 + (((D - o) m) >> 9) + 16) >> 5
//   partial tile                  clamp(D + (((S13 - 512) c + 0x40000) >> 19))
//   partial overlay               e = (A c + 256) >> 9:
//                                 (((D - o)(0x80000 - e) + (S13 - 512) c + 0x40000) >> 19) + o
// with 4096 for 512 in chroma. Luma is clamped only in tile, chroma always; RGBQ
// has no offsets and is clamped only in tile.
#pragma once

#include "shared/isa.h"

#include "horizontal/pixel.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

struct SourceAlphaFamily : FamilyTraits<false> {
    static constexpr bool source_alpha = true;
    static constexpr bool general_alpha = true;
    static constexpr int unclamped_max_taps = 4;

    template <class Dst, class Shape>
    static void whole(const MapContext& c, typename Dst::sample* d, uint16_t*, const Px& px)
    {
        using T = typename Dst::sample;
        const int32_t A = px.a;
        if (A < 1) return;
        const int32_t L = c.level;
        for (int i = 0; i < Shape::n; ++i) {
            const int32_t o = offset_of<Dst, Shape>(i);
            const int32_t D = d[Shape::at[i]], S = px.s[i];
            const bool renorm = A > 16384 && !Shape::chroma[i];
            int32_t v;
            if (L == 4096) {
                v = renorm ? ((S - o) * 16384) / A + o : (((D - o) * (16384 - A) + 8192) >> 14) + S;
            } else if (renorm) {
                const int32_t s = ((S - o) * 16384) / A + o;
                v = (s * L + (4096 - L) * D + 2048) >> 12;
            } else {
                const int32_t e = A > 16384 ? L : (A * L + 8192) >> 14;
                v = (((D - o) * (4096 - e) + (S - o) * L + 2048) >> 12) + o;
            }
            d[Shape::at[i]] = T(clamp_to(v, 0, Dst::max));
        }
    }

    template <class Dst, class Shape>
    static void partial(const MapContext& c, typename Dst::sample* d, uint16_t*, const Px& px, int32_t w)
    {
        using T = typename Dst::sample;
        const int32_t A = px.a;
        if (A < 1) return;
        for (int i = 0; i < Shape::n; ++i) {
            const int32_t o = offset_of<Dst, Shape>(i);
            const int32_t D = d[Shape::at[i]], S = px.s[i];
            const bool renorm = A > 16384 && !Shape::chroma[i];
            int32_t v;
            if (c.tile) {
                const int32_t part = renorm ? ((S - o) * 16384) / A : S - o;
                v = D + ((part * w + 8192) >> 14);
            } else if (renorm) {
                const int32_t s = ((S - o) * 16384) / A + o;
                v = (s * w + (16384 - w) * D + 8192) >> 14;
            } else {
                const int32_t e = A > 16384 ? w : (w * A + 8192) >> 14;
                v = (((D - o) * (16384 - e) + (S - o) * w + 8192) >> 14) + o;
            }
            d[Shape::at[i]] = T(clamp_to(v, 0, Dst::max));
        }
    }

    // Constant regions: A is the buffer's alpha sample (1/16384). Below 1 the
    // region draws nothing; above 16384 the luma (every RGBQ sample) is
    // brought back to full opacity and A becomes 16384; then the samples are
    // limited. Overlay mixes without clamping, tile adds with clamping, and
    // the RGBQ tile region carries its running sum.
    template <class Dst>
    static bool region_setup(const MapContext&, Px& px)
    {
        if (px.a < 1) return false;
        if (px.a > 16384) {
            const int n = Dst::pairs ? 1 : 4;
            for (int e = 0; e < n; ++e) px.s[e] = ((px.s[e] - Dst::luma_offset) * 16384) / px.a + Dst::luma_offset;
            px.a = 16384;
        }
        for (int e = 0; e < 4; ++e) px.s[e] = clamp_to(px.s[e], 0, Dst::max);
        return true;
    }

    template <class Dst, class Shape>
    static void region_pixel(const MapContext& c, typename Dst::sample* d, uint16_t*, Px& px, int32_t w)
    {
        using T = typename Dst::sample;
        const int32_t e = (w * px.a + 8192) >> 14;
        for (int i = 0; i < Shape::n; ++i) {
            const int32_t o = offset_of<Dst, Shape>(i);
            const int32_t D = d[Shape::at[i]], S = px.s[i];
            if (c.tile) {
                const int32_t sum = int32_t(uint32_t(D) + uint32_t(mul_round_wrap(S - o, w, 8192, 14)));
                d[Shape::at[i]] = T(clamp_to(sum, 0, Dst::max));
                if constexpr (!Dst::pairs) px.s[i] = sum;
            } else {
                d[Shape::at[i]] = T((((D - o) * (16384 - e) + (S - o) * w + 8192) >> 14) + o);
            }
        }
    }
};

// The fast form: colour in buffer units, level 4096, no clamp of the samples.
struct SourceAlphaFastFamily : SourceAlphaFamily {
    static constexpr bool fast_alpha = true;
    static constexpr bool general_alpha = false;

    template <class Dst>
    static int32_t weight(const MapContext& c, int32_t hc)
    {
        return weight_c14(hc, c.vcover, 4096);
    }

    template <class Dst>
    static constexpr int32_t black(bool chroma)
    {
        return Dst::pairs ? (chroma ? 4096 : 512) : 0;
    }

    template <class Dst, class Shape>
    static void whole(const MapContext&, typename Dst::sample* d, uint16_t*, const Px& px)
    {
        using T = typename Dst::sample;
        constexpr int sh = Dst::buffer_shift;
        const int32_t A = px.a;
        if (A < 1) return;
        const int32_t m = 16384 - A;
        for (int i = 0; i < Shape::n; ++i) {
            const int32_t o = offset_of<Dst, Shape>(i);
            const int32_t D = d[Shape::at[i]];
            const int32_t v = (px.s[i] + (((D - o) * m) >> (14 - sh)) + (1 << (sh - 1))) >> sh;
            d[Shape::at[i]] = T(Shape::chroma[i] ? clamp_to(v, 0, Dst::max) : v);
        }
    }

    template <class Dst, class Shape>
    static void partial(const MapContext& c, typename Dst::sample* d, uint16_t*, const Px& px, int32_t w)
    {
        using T = typename Dst::sample;
        constexpr int sh = Dst::buffer_shift;
        const int32_t A = px.a;
        if (A < 1) return;
        for (int i = 0; i < Shape::n; ++i) {
            const int32_t o = offset_of<Dst, Shape>(i);
            const int32_t D = d[Shape::at[i]];
            const int32_t part = px.s[i] - black<Dst>(Shape::chroma[i]);
            if (c.tile) {
                const int32_t v = D + ((part * w + (1 << (13 + sh))) >> (14 + sh));
                d[Shape::at[i]] = T(clamp_to(v, 0, Dst::max));
            } else {
                const int32_t e = (A * w + (1 << (13 - sh))) >> (14 - sh);
                const int32_t v = (((D - o) * ((1 << (14 + sh)) - e) + part * w + (1 << (13 + sh))) >> (14 + sh)) + o;
                d[Shape::at[i]] = T(Shape::chroma[i] ? clamp_to(v, 0, Dst::max) : v);
            }
        }
    }
};

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
