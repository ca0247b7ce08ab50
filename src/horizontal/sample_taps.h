// Tap samplers: the sample at a position of the line buffer, by linear
// interpolation with a 16-bit fraction (slot 3) or by a bank row of 2(T + 1)
// taps k = -T .. T + 1 (slots 4 + T).
//
// Position: pos is 16.16 in buffer pixels; i = pos >> 16, f = pos & 0xFFFF,
// ph = (pos >> 12) & 15 (the top four bits of the fraction, truncated). Tap k
// of a bank phase stands at index 7 + k.
//
// 4:2:2 buffers: luma of pixel n is L(2n); chroma pair j has Cb at L(4j + 1)
// and Cr at L(4j + 3); j = i >> 1. Chroma is computed only for even
// destination pixels, but its phase follows the parity of buffer pixel i: the
// chroma bank row `hbank_c` serves the double sample spacing, phase row
// ph >> 1 for even i and (ph >> 1) + 8 for odd i. Linear chroma weighs in
// units of 0x20000: even i (0x20000 - f, f), odd i (0x10000 - f, 0x10000 + f).
//
// RGBQ buffers: four samples per pixel, all by the luma rule. Alpha, where
// the table has it, is read from `line_a` at pixel i by the luma rule with the
// luma coefficients.
//
// Results carry one rounding, in the units of sample_units.h.
// Reach: luma pixels i - T .. i + T + 1, chroma pairs j - T .. j + T + 1; the
// strip plan leaves that margin.
#pragma once

#include "shared/isa.h"

#include "horizontal/pixel.h"
#include "horizontal/sample_units.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

template <class Units>
struct LinearSampler {
    using Dst = typename Units::Dst;
    static constexpr int taps = 2;
    static constexpr bool is_bank = false;

    const int16_t* line;
    const int16_t* line_a;
    int32_t pos;
    int32_t step;

    LinearSampler(const MapContext& c, const StripRecord& s, bool)
        : line(c.line), line_a(c.line_a), pos(s.phase), step(c.hstep) {}

    static int32_t lerp(const int16_t* v, int32_t spacing, int32_t f)
    {
        return mix_w16<Units::colour_shift>(int64_t(v[0]) * (0x10000 - f) + int64_t(v[spacing]) * f);
    }

    void sample(Px& px, bool with_chroma, bool = false) const
    {
        const int32_t i = pos >> 16, f = pos & 0xFFFF;
        if constexpr (Dst::pairs) {
            px.s[0] = lerp(line + 2 * i, 2, f);
            if (with_chroma) {
                const int32_t j = i >> 1;
                const int32_t w0 = (i & 1) ? 0x10000 - f : 0x20000 - f;
                const int32_t w1 = (i & 1) ? 0x10000 + f : f;
                for (int c = 0; c < 2; ++c) {
                    const int16_t* cs = line + 4 * j + 1 + 2 * c;
                    px.s[1 + c] = mix_w17<Units::colour_shift>(int64_t(cs[0]) * w0 + int64_t(cs[4]) * w1);
                }
            }
        } else {
            for (int e = 0; e < Dst::colour_samples; ++e) px.s[e] = lerp(line + 4 * i + e, 4, f);
        }
        if constexpr (Units::alpha)
            px.a = mix_w16<Units::alpha_shift>(int64_t(line_a[i]) * (0x10000 - f) + int64_t(line_a[i + 1]) * f);
    }

    void advance() { pos += step; }
};

template <class Units, int T>
struct BankSampler {
    using Dst = typename Units::Dst;
    static constexpr int taps = 2 * (T + 1);
    static constexpr bool is_bank = true;

    const int16_t* line;
    const int16_t* line_a;
    const int16_t* bank_y;
    const int16_t* bank_c;
    int32_t pos;
    int32_t step;

    BankSampler(const MapContext& c, const StripRecord& s, bool)
        : line(c.line), line_a(c.line_a), bank_y(c.hbank_y), bank_c(c.hbank_c), pos(s.phase), step(c.hstep) {}

    // Sum of taps over elements v[k * spacing], k = -T .. T + 1.
    static int32_t taps_sum(const int16_t* row, const int16_t* v, int32_t spacing)
    {
        int32_t sum = 0;
        for (int k = -T; k <= T + 1; ++k) sum += row[7 + k] * int32_t(v[k * spacing]);
        return sum;
    }

    void sample(Px& px, bool with_chroma, bool = false) const
    {
        constexpr int cs = Units::colour_shift;
        const int32_t i = pos >> 16, ph = (pos >> 12) & 15;
        const int16_t* row = bank_y + ph * 16;
        if constexpr (Dst::pairs) {
            px.s[0] = mix_bank<cs>(taps_sum(row, line + 2 * i, 2));
            if (with_chroma) {
                const int32_t j = i >> 1;
                const int16_t* crow = bank_c + ((ph >> 1) + ((i & 1) ? 8 : 0)) * 16;
                px.s[1] = mix_bank<cs>(taps_sum(crow, line + 4 * j + 1, 4));
                px.s[2] = mix_bank<cs>(taps_sum(crow, line + 4 * j + 3, 4));
            }
        } else {
            for (int e = 0; e < Dst::colour_samples; ++e) px.s[e] = mix_bank<cs>(taps_sum(row, line + 4 * i + e, 4));
        }
        if constexpr (Units::alpha) px.a = mix_bank<Units::alpha_shift>(taps_sum(row, line_a + i, 1));
    }

    void advance() { pos += step; }
};

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
