// Composition of an alpha-only source into an alpha-only destination (table
// H_ALPHA). There is no colour: D is the destination's alpha word and A the
// source alpha in 1/4096. A pixel with A of 0 or less writes nothing.
//
//   whole, L 4096                 overlay (((4096 - A) D + 2048) >> 12) + A; tile A
//   whole, other L (e > 0)        e = (A L + 2048) >> 12:
//                                 overlay (((4096 - e) D + 2048) >> 12) + e; tile e
//   partial                       e = (c A + 2048) >> 12, c the 12-bit weight:
//                                 overlay (((4096 - e) D + 2048) >> 12) + e; tile D + e
//
// The bank kernels, whose A can overshoot, limit a whole pixel: at L 4096 an A
// of 4096 or more gives D = 4096; at another L an A above 4096 gives e = L,
// and e is not tested. The tile sum is a 16-bit sum, never clamped.
#pragma once

#include "shared/isa.h"

#include "horizontal/pixel.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

template <bool Bank>
struct AlphaOnlyFamilyT : FamilyTraits<true> {
    static constexpr bool source_alpha = true;  // the image itself is the plane
    static constexpr int unclamped_max_taps = 16;

    template <class Dst, class Shape>
    static void whole(const MapContext& c, uint16_t* d, uint16_t*, const Px& px)
    {
        const int32_t A = px.a, D = *d, L = c.level;
        if (A <= 0) return;
        if (L == 4096) {
            if (Bank && A >= 4096)
                *d = 4096;
            else
                *d = uint16_t(c.tile ? A : (((4096 - A) * D + 2048) >> 12) + A);
            return;
        }
        const int32_t e = Bank && A > 4096 ? L : (A * L + 2048) >> 12;
        if (!Bank && e <= 0) return;
        *d = uint16_t(c.tile ? e : (((4096 - e) * D + 2048) >> 12) + e);
    }

    template <class Dst, class Shape>
    static void partial(const MapContext& c, uint16_t* d, uint16_t*, const Px& px, int32_t w)
    {
        const int32_t A = px.a, D = *d;
        if (A <= 0) return;
        const int32_t e = (w * A + 2048) >> 12;
        *d = uint16_t(c.tile ? D + e : (((4096 - e) * D + 2048) >> 12) + e);
    }

    // Constant regions: A = the lesser of (alpha sample + 2) >> 2 and 4096;
    // below 1 nothing is drawn. Each pixel replaces A by (c A + 2048) >> 12,
    // and the new value carries to the next pixel: the order of the partial
    // pixels matters, which is intended.
    template <class Dst>
    static bool region_setup(const MapContext&, Px& px)
    {
        px.a = (px.a + 2) >> 2;
        if (px.a > 4096) px.a = 4096;
        return px.a >= 1;
    }

    template <class Dst, class Shape>
    static void region_pixel(const MapContext& c, uint16_t* d, uint16_t*, Px& px, int32_t w)
    {
        px.a = mul_round_wrap(w, px.a, 2048, 12);
        const int32_t D = *d;
        // With a gain the running value can outgrow 32 bits; it wraps.
        const uint32_t mixed = uint32_t(mul_round_wrap(4096 - px.a, D, 2048, 12)) + uint32_t(px.a);
        *d = uint16_t(c.tile ? uint32_t(D) + uint32_t(px.a) : mixed);
    }
};

using AlphaOnlyFamily = AlphaOnlyFamilyT<false>;
using AlphaOnlyBankFamily = AlphaOnlyFamilyT<true>;

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
