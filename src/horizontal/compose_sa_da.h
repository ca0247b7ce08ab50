// Composition of a source with alpha into a destination with an alpha plane
// (tables H_YUY2_SA_DA, H_W210_SA_DA, H_RGBQ_SA_DA). All of it in 12 bits: A
// is the source alpha in 1/4096, Dα the destination's alpha word. The samples
// are always limited to 0..M first, and every result is clamped. A pixel with
// A below 1 writes nothing.
//
// Whole pixel at L 4096:
//   A >= 4096                     Dα' = 4096    luma clamp(((S - o) 4096) / A + o), chroma clamp(S)
//   tile, premultiplied           Dα' = A       clamp(S)
//   tile, straight                Dα' = A       clamp(((S - o) 4096) / A + o)
//   overlay, premultiplied        Dα' = ((Dα (4096 - A) + 2048) >> 12) + A
//                                 clamp((((D - o)(4096 - A) + 2048) >> 12) + S)
//   overlay, straight             d = ((4096 - A) Dα + 2048) >> 12, t = A + d
//                                 Dα' = t       clamp((((D - o) d + ((S - o) << 12)) / t) + o)
// Whole pixel at another L, with a = (A L + 2048) >> 12 (a = L when A > 4096,
// and then luma uses r = ((S - o) 4096) / A in place of S - o):
//   tile, premultiplied           Dα' = a       clamp((((S - o) L + 2048) >> 12) + o)
//   tile, straight (a > 0)        Dα' = a       clamp(((S - o) L) / a + o); luma above 4096: clamp(r + o)
//   overlay, premultiplied        Dα' = ((Dα (4096 - a) + 2048) >> 12) + a
//                                 clamp((((D - o)(4096 - a) + (S - o) L + 2048) >> 12) + o)
//   overlay, straight (t > 0)     d = ((4096 - a) Dα + 2048) >> 12, t = a + d
//                                 Dα' = t       clamp((((D - o) d + (S - o) L) / t) + o)
// Partly covered pixel, c the 12-bit weight, e = (c A + 2048) >> 12 (e = c
// when A > 4096, luma first brought back: s = ((S - o) 4096) / A + o):
//   tile, premultiplied           Dα' = Dα + e  clamp(D + (((s - o) c + 2048) >> 12))
//   tile, straight (e > 0)        Dα' = Dα + e  clamp((((D - o) Dα + (s - o) c) / Dα') + o)
//   overlay, premultiplied        Dα' = ((Dα (4096 - e) + 2048) >> 12) + e
//                                 clamp((((D - o)(4096 - e) + (s - o) c + 2048) >> 12) + o)
//   overlay, straight (e > 0)     d = ((4096 - e) Dα + 2048) >> 12, Dα' = d + e
//                                 clamp((((D - o) d + (s - o) c) / Dα') + o)
// Chroma of a pair follows the luma row with the chroma offset, is never
// brought back, divides by the new Dα wherever luma divides, and is written
// only when the new Dα is not 0. RGBQ samples all follow the luma rows.
#pragma once

#include "shared/isa.h"

#include "horizontal/pixel.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

struct SourceDestAlphaFamily : FamilyTraits<true> {
    static constexpr bool dest_alpha = true;
    static constexpr bool source_alpha = true;
    static constexpr bool clamps_always = true;

    template <class Dst, class Shape>
    static void whole(const MapContext& c, typename Dst::sample* d, uint16_t* da, const Px& px)
    {
        using T = typename Dst::sample;
        const int32_t A = px.a;
        if (A < 1) return;
        const int32_t L = c.level;
        const int32_t Da = *da;
        const bool pre = c.dst_assoc == 2;
        const auto put = [&](int i, int32_t v) { d[Shape::at[i]] = T(clamp_to(v, 0, Dst::max)); };

        if (L == 4096) {
            if (A >= 4096) {
                *da = 4096;
                for (int i = 0; i < Shape::n; ++i) {
                    const int32_t o = offset_of<Dst, Shape>(i), S = px.s[i];
                    put(i, Shape::chroma[i] ? S : ((S - o) * 4096) / A + o);
                }
            } else if (c.tile) {
                *da = uint16_t(A);
                for (int i = 0; i < Shape::n; ++i) {
                    const int32_t o = offset_of<Dst, Shape>(i), S = px.s[i];
                    put(i, pre ? S : ((S - o) * 4096) / A + o);
                }
            } else if (pre) {
                *da = uint16_t(((Da * (4096 - A) + 2048) >> 12) + A);
                for (int i = 0; i < Shape::n; ++i) {
                    const int32_t o = offset_of<Dst, Shape>(i), D = d[Shape::at[i]];
                    put(i, (((D - o) * (4096 - A) + 2048) >> 12) + px.s[i]);
                }
            } else {
                const int32_t dd = ((4096 - A) * Da + 2048) >> 12, t = A + dd;
                if (t == 0) return;
                *da = uint16_t(t);
                for (int i = 0; i < Shape::n; ++i) {
                    const int32_t o = offset_of<Dst, Shape>(i), D = d[Shape::at[i]];
                    put(i, (((D - o) * dd + ((px.s[i] - o) << 12)) / t) + o);
                }
            }
            return;
        }

        const bool over = A > 4096;
        const int32_t a = over ? L : (A * L + 2048) >> 12;
        // S - o, with luma brought back to full opacity when A exceeds 4096.
        const auto part = [&](int i) {
            const int32_t v = px.s[i] - offset_of<Dst, Shape>(i);
            return over && !Shape::chroma[i] ? (v * 4096) / A : v;
        };
        if (c.tile) {
            if (!pre && a == 0) return;
            *da = uint16_t(a);
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t o = offset_of<Dst, Shape>(i);
                if (pre)
                    put(i, ((part(i) * L + 2048) >> 12) + o);
                else if (over && !Shape::chroma[i])
                    put(i, part(i) + o);
                else
                    put(i, ((px.s[i] - o) * L) / a + o);
            }
        } else if (pre) {
            *da = uint16_t(((Da * (4096 - a) + 2048) >> 12) + a);
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t o = offset_of<Dst, Shape>(i), D = d[Shape::at[i]];
                put(i, (((D - o) * (4096 - a) + part(i) * L + 2048) >> 12) + o);
            }
        } else {
            const int32_t dd = ((4096 - a) * Da + 2048) >> 12, t = a + dd;
            if (t == 0) return;
            *da = uint16_t(t);
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t o = offset_of<Dst, Shape>(i), D = d[Shape::at[i]];
                put(i, (((D - o) * dd + part(i) * L) / t) + o);
            }
        }
    }

    template <class Dst, class Shape>
    static void partial(const MapContext& c, typename Dst::sample* d, uint16_t* da, const Px& px, int32_t w)
    {
        using T = typename Dst::sample;
        const int32_t A = px.a;
        if (A < 1) return;
        const bool over = A > 4096;
        const int32_t e = over ? w : (w * A + 2048) >> 12;
        const int32_t Da = *da;
        const bool pre = c.dst_assoc == 2;
        int32_t d_old;  // the destination alpha's weight in the division rows
        int32_t na;
        if (c.tile) {
            if (!pre && e <= 0) return;
            d_old = Da;
            na = Da + e;
        } else if (pre) {
            d_old = 0;
            na = ((Da * (4096 - e) + 2048) >> 12) + e;
        } else {
            if (e <= 0) return;
            d_old = ((4096 - e) * Da + 2048) >> 12;
            na = d_old + e;
        }
        for (int i = 0; i < Shape::n; ++i) {
            const bool chroma = Shape::chroma[i];
            if (chroma && na == 0) break;
            const int32_t o = offset_of<Dst, Shape>(i), D = d[Shape::at[i]];
            const int32_t s = over && !chroma ? ((px.s[i] - o) * 4096) / A + o : px.s[i];
            int32_t v;
            if (c.tile && pre)
                v = D + (((s - o) * w + 2048) >> 12);
            else if (pre)
                v = (((D - o) * (4096 - e) + (s - o) * w + 2048) >> 12) + o;
            else
                v = (((D - o) * d_old + (s - o) * w) / na) + o;
            d[Shape::at[i]] = T(clamp_to(v, 0, Dst::max));
        }
        *da = uint16_t(na);
    }

    // Constant regions: A = (alpha sample + 2) >> 2. Below 1 nothing is drawn;
    // above 4096 the luma (every RGBQ sample) is brought back and A becomes
    // 4096. The samples are not limited here; the partial rule clamps.
    template <class Dst>
    static bool region_setup(const MapContext&, Px& px)
    {
        px.a = (px.a + 2) >> 2;
        if (px.a < 1) return false;
        if (px.a > 4096) {
            const int n = Dst::pairs ? 1 : 4;
            for (int e = 0; e < n; ++e) px.s[e] = ((px.s[e] - Dst::luma_offset) * 4096) / px.a + Dst::luma_offset;
            px.a = 4096;
        }
        return true;
    }

    template <class Dst, class Shape>
    static void region_pixel(const MapContext& c, typename Dst::sample* d, uint16_t* da, Px& px, int32_t w)
    {
        partial<Dst, Shape>(c, d, da, px, w);
    }
};

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
