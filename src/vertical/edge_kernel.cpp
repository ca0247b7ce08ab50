// The edge-adaptive vertical interpolator of filter kind 7.
//
// It interpolates between lines L and L + 1 at phase ph (sixteenths) and picks
// per element among a six-tap filter F, the linear value Lin and F bounded by
// an extrapolation, so that edges stay sharp without ringing on flat areas.
// Six lines L - 2 .. L + 3 are read by stride from lines[0]. The coefficients
// are taps 5..10 of phase ph of the first row of BANK_LANCZOS3, whatever
// `vbank` says.
//
// The line is treated as pairs of bytes: the first byte of a pair goes through
// the decision, the second is always linear. In RGBQ that makes the first and
// third bytes of a pixel adaptive and the second and fourth linear, exactly as
// luma and chroma in YUY2; this is intended. Results are stored as 16 bits
// without saturation, from element 0 of the buffer: `pad_left` is not added.
// The samples then stand to the left of where the horizontal stage expects
// them, which is intended too.
#include <cstdlib>

#include "shared/banks.h"
#include "vertical/vertical_kernels.h"

namespace lorvex::vertical {
namespace {

constexpr int kLarge = 20;

inline bool small(int d) { return std::abs(d) < kLarge; }

// One adaptive element; l[i] is the byte of line L + i - 2.
inline int16_t edge_element(const int c[6], int ph, const int l[6])
{
    const int F = (c[0] * l[0] + c[1] * l[1] + c[2] * l[2] + c[3] * l[3] + c[4] * l[4] + c[5] * l[5]) >> 9;
    const int lin = ((16 - ph) * l[2] + ph * l[3]) * 2;
    const int d_top = l[1] - l[0], d_up = l[2] - l[1], d_mid = l[3] - l[2], d_dn = l[4] - l[3],
              d_bot = l[5] - l[4];

    if ((small(d_up) && small(d_top)) || (small(d_dn) && small(d_bot))) {
        // Flat on at least one side: bound F between Lin and the nearer of
        // the two extrapolations.
        const int e_up = 2 * (16 * l[2] + ph * d_up);
        const int e_dn = 2 * (16 * l[3] - (16 - ph) * d_dn);
        const int e = std::abs(e_up - lin) < std::abs(e_dn - lin) ? e_up : e_dn;
        const int lo = e < lin ? e : lin, hi = e < lin ? lin : e;
        return int16_t(F < lo ? lo : (F > hi ? hi : F));
    }
    if (!small(d_mid)) return int16_t(F);
    if (small(d_up)) {  // d_top is large here
        if (small(d_dn)) return int16_t(lin);
        if (d_dn > 0) return int16_t(d_top >= kLarge ? F : lin);
        return int16_t(d_top <= -kLarge ? F : lin);
    }
    if (!small(d_dn)) return int16_t(F);
    if (d_up > 0) return int16_t(d_bot >= kLarge ? F : lin);
    return int16_t(d_bot <= -kLarge ? F : lin);
}

void edge7(const MapContext& ctx, int32_t first_byte, int32_t end_byte, int32_t pad_left_elements,
           int32_t pixel_elements)
{
    const int ph = ctx.vphase;
    const int16_t* taps = BANK_LANCZOS3[0][ph] + 5;
    const int c[6] = {taps[0], taps[1], taps[2], taps[3], taps[4], taps[5]};
    const uint8_t* rows[6];
    for (int i = 0; i < 6; ++i) rows[i] = ctx.lines[0] + ptrdiff_t(ctx.src_stride) * (i - 2);

    int16_t* out = ctx.line;
    for (int32_t b = first_byte; b < end_byte; b += 2, out += 2) {
        int l[6];
        for (int i = 0; i < 6; ++i) l[i] = rows[i][b];
        out[0] = edge_element(c, ph, l);
        out[1] = int16_t(((16 - ph) * rows[2][b + 1] + ph * rows[3][b + 1]) * 2);
    }
    // The elements of the strip's range that the kernel leaves behind when
    // pad_left is not 0 repeat its last pixel, so that no line depends on
    // what an earlier line left in the buffer.
    const int32_t written = end_byte - first_byte;
    const int32_t range_end = pad_left_elements + written;
    for (int32_t e = written; e < range_end; ++e) ctx.line[e] = ctx.line[e - pixel_elements];
}

}  // namespace

void edge7_yuy2_C(const MapContext& ctx, const StripRecord& s)
{
    edge7(ctx, 2 * s.src_first, 2 * ((s.src_end + 1) & ~1), 2 * s.pad_left, 4);
}

void edge7_rgbq_C(const MapContext& ctx, const StripRecord& s)
{
    edge7(ctx, 4 * s.src_first, 4 * s.src_end, 4 * s.pad_left, 4);
}

}  // namespace lorvex::vertical
