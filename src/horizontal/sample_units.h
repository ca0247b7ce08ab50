// What a sampler computes for one pixel, as a table's composition needs it:
// colour in stored depth (or, in the fast variant of the source-alpha tables,
// in buffer units), and source alpha in 1/16384 or 1/4096 where the table has
// source alpha. The units are expressed as the shift of the mix rounding
// (formats.h): colour 5 (8-bit), 3 (10-bit) or 0 (buffer units); alpha 0
// (1/16384), 2 (1/4096) or none.
#pragma once

#include "shared/isa.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

constexpr int kNoAlpha = -1;

template <class DstT, int ColourShift, int AlphaShift, bool TruncatedPairLuma = false>
struct SampleSpec {
    using Dst = DstT;
    static constexpr int colour_shift = ColourShift;
    static constexpr int alpha_shift = AlphaShift;
    static constexpr bool alpha = AlphaShift != kNoAlpha;
    // The fast source-alpha variant's area luma from two samples has no
    // rounding term; its results are kept as they are.
    static constexpr bool truncated_pair_luma = TruncatedPairLuma;
};

// Colour in the destination's depth, alpha as the family asks.
template <class Dst, int AlphaShift = kNoAlpha>
using StoredSpec = SampleSpec<Dst, Dst::buffer_shift, AlphaShift>;

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
