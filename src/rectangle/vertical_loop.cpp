// The walk over the destination lines. For each line that the call draws and
// each strip of the plan: the vertical kernel fills the line buffer, the pad
// kernels complete it at its ends (and the same for a separate alpha pass),
// then the constant-region kernels and the main kernel write the line.
//
// Vertical positions are 16.16 source lines (vpos); the destination runs in
// 1/16384 of a line (H16, vcover). Exactly the lines L with L congruent to
// line_phase modulo line_period are drawn, and each drawn line is the same as
// if all were drawn: the position runs on through the lines passed over.
//
// The five ways of choosing the vertical kernel for a line (linear, two taps,
// wide, kind 7, area) are separate instantiations of one walk, so the line
// loop holds no test of the kind.
#include <algorithm>

#include "rectangle/rectangle.h"
#include "shared/banks.h"

namespace lorvex::rectangle {
namespace {

struct Source {
    const uint8_t* data;
    const uint8_t* alpha;
    int32_t stride, alpha_stride;
    int32_t height;  // in the field's terms

    const uint8_t* line(int32_t l) const { return data + ptrdiff_t(stride) * l; }
    const uint8_t* alpha_line(int32_t l) const
    {
        return alpha ? alpha + ptrdiff_t(alpha_stride) * l : nullptr;
    }
    void point(MapContext& c, int k, int32_t l) const
    {
        c.lines[k] = line(l);
        c.lines2[k] = alpha_line(l);
    }
};

// The kernels of one line, as a selector chose them.
struct LineKernels {
    Kernel colour;
    Kernel alpha;  // or null
};

void draw_strips(const Call& k, MapContext& c, const Plan& plan, LineKernels lk)
{
    const VerticalKernelTable& vt = *k.vtable;
    const HorizontalKernelTable& ht = *k.htable;
    const Kernel main = ht[size_t(plan.main_slot)];
    for (int i = 0; i < plan.count; ++i) {
        const StripRecord& s = plan.strips[i];
        lk.colour(c, s);
        if (s.pad_left) vt[vslot::pad_left](c, s);
        if (s.pad_right) vt[vslot::pad_right](c, s);
        if (lk.alpha) {
            const VerticalKernelTable& at = *k.alpha_vtable;
            lk.alpha(c, s);
            if (s.pad_left) at[vslot::pad_left](c, s);
            if (s.pad_right) at[vslot::pad_right](c, s);
        }
        if (s.left_width16) ht[hslot::left](c, s);
        if (s.right_width16) ht[hslot::right](c, s);
        if (s.width16) main(c, s);
    }
}

template <class Select>
void walk(Call& k, const Plan& plan, Select& select)
{
    MapContext& c = k.ctx;
    const int32_t f = k.Y0 & 0x3FFF;
    const int32_t L0 = k.Y0 >> 14;
    uint8_t* dst = k.dst_data ? k.dst_data + ptrdiff_t(k.dst_stride) * L0 : nullptr;
    uint8_t* dst2 = k.dst_alpha ? k.dst_alpha + ptrdiff_t(k.dst_alpha_stride) * L0 : nullptr;
    int32_t wait = (k.line_phase - L0) % k.line_period;
    if (wait < 0) wait += k.line_period;
    int32_t H16 = k.H16;
    int32_t vcover = std::min(16384 - f, H16);

    for (;;) {
        if (wait == 0) {
            c.dst_line = dst;
            c.dst_line2 = dst2;
            c.vcover = vcover;
            draw_strips(k, c, plan, select.line(c));
            wait = k.line_period;
        }
        H16 -= vcover;
        if (H16 <= 0) return;
        select.advance(c);
        if (dst) dst += k.dst_stride;
        if (dst2) dst2 += k.dst_alpha_stride;
        vcover = std::min(H16, 16384);
        --wait;
    }
}

// Linear loop: two lines with a 16-bit fraction, a single line at the edges.
struct LinearSelect {
    const Call& k;
    Source src;
    int32_t vpos, vstep16;

    LineKernels line(MapContext& c)
    {
        const int32_t row = vpos >> 16;
        c.src_line = row;
        c.vphase = vpos & 0xFFFF;
        return pick(c, row, vslot::linear);
    }
    // Shared by the linear and the two-tap loops.
    LineKernels pick(MapContext& c, int32_t row, int slot) const
    {
        int32_t l;
        if (row < 0) {
            l = 0;
            slot = vslot::line_above;
        } else if (row < src.height - 1) {
            l = row;
        } else {
            l = src.height - 1;
            slot = vslot::line_below;
        }
        src.point(c, 0, l);
        return {(*k.vtable)[size_t(slot)], k.alpha_vtable ? (*k.alpha_vtable)[size_t(slot)] : nullptr};
    }
    void advance(MapContext&) { vpos += vstep16; }
};

// Two-tap loop (T = 1): bank phase in four bits.
struct TwoTapSelect : LinearSelect {
    LineKernels line(MapContext& c)
    {
        const int32_t row = vpos >> 16;
        c.src_line = row;
        c.vphase = (vpos >> 12) & 15;
        return pick(c, row, vslot::two_taps);
    }
};

// Wide loop (T >= 2): 2T lines by stride inside the source; through the
// pointer array, with the edge line repeated, where some taps fall outside.
struct WideSelect {
    const Call& k;
    Source src;
    int32_t vpos, vstep16;
    int T;

    LineKernels line(MapContext& c)
    {
        const int32_t row = vpos >> 16;
        const int32_t H = src.height;
        c.src_line = row;
        c.vphase = (vpos >> 12) & 15;
        int slot;
        if (row >= T - 1 && row <= H - T - 1) {
            src.point(c, 0, row);
            slot = vslot::stride_taps + T;
        } else if (row <= -T) {
            src.point(c, 0, 0);
            slot = vslot::line_above;
        } else if (row >= H + T - 2) {
            src.point(c, 0, H - 1);
            slot = vslot::line_below;
        } else {
            for (int kk = 1 - T; kk <= T; ++kk) src.point(c, kk, std::clamp(row + kk, 0, H - 1));
            slot = vslot::pointer_taps + T;
        }
        return {(*k.vtable)[size_t(slot)], k.alpha_vtable ? (*k.alpha_vtable)[size_t(slot)] : nullptr};
    }
    void advance(MapContext&) { vpos += vstep16; }
};

// Kind 7: the edge-adaptive kernel inside, one line outside, and the linear
// kernel with the four-bit phase near the edges, which keeps those few lines
// close to the upper line; intended. No alpha pass.
struct EdgeSelect {
    const Call& k;
    Source src;
    int32_t vpos, vstep16;

    LineKernels line(MapContext& c)
    {
        const int32_t row = vpos >> 16;
        const int32_t H = src.height;
        c.src_line = row;
        c.vphase = (vpos >> 12) & 15;
        int slot;
        if (row < 0) {
            src.point(c, 0, 0);
            slot = vslot::line_above;
        } else if (row >= H - 1) {
            src.point(c, 0, H - 1);
            slot = vslot::line_below;
        } else if (row >= 3 && row <= H - 5) {
            src.point(c, 0, row);
            slot = vslot::edge;
        } else {
            src.point(c, 0, row);
            slot = vslot::linear;
        }
        return {(*k.vtable)[size_t(slot)], nullptr};
    }
    void advance(MapContext&) { vpos += vstep16; }
};

// Area loop: whole source lines as cells of `cell` destination units; each
// destination line sums the lines under it with exact weights.
struct AreaSelect {
    const Call& k;
    Source src;
    int32_t H1;
    int32_t cell;
    int64_t rest;  // how much of the current source line is still unused
    int32_t cur;

    static constexpr int64_t kEndless = 0x9C40000;  // ten thousand lines

    AreaSelect(const Call& call, Source s, int32_t f) : k(call), src(s)
    {
        H1 = src.height - 1;
        cell = trunc_i32(16384.0 / k.vstep + 0.5);
        int64_t b = trunc_i64(double(cell) * k.sy0) - f;
        if (cell < 1) cell = 1;
        if (b < 0) {
            rest = cell - b;
            b = 0;
        } else {
            rest = cell - b % cell;
        }
        cur = int32_t(std::min<int64_t>(b / cell, INT32_MAX));
        if (cur >= H1) {
            cur = H1;
            rest = kEndless;
        }
    }

    LineKernels line(MapContext& c)
    {
        c.src_line = cur;
        src.point(c, 0, cur);
        c.box_step = cell;
        int32_t first = int32_t(std::min<int64_t>(rest, 16384));
        int32_t r = 16384 - first;
        int32_t mid = 0;
        if (cur >= H1) {
            first = 16384;
            r = 0;
        } else if (r != 0) {
            for (int32_t l = cur;;) {
                ++l;
                if (l >= H1 || r <= cell) break;
                ++mid;
                r -= cell;
                if (r == 0) break;
            }
        }
        c.box_first = first;
        c.box_mid = mid;
        c.box_last = r;
        return {(*k.vtable)[vslot::box], k.alpha_vtable ? (*k.alpha_vtable)[vslot::box] : nullptr};
    }

    void advance(MapContext&)
    {
        rest -= 16384;
        while (rest <= 0) {
            if (cur >= H1) {
                rest = kEndless;
                break;
            }
            rest += cell;
            ++cur;
        }
    }
};

// The vertical filter choice: bank row and half-width T (2T taps), or one of
// the loops without a bank.
enum class Loop { area, linear, two_taps, wide, edge };

struct VerticalChoice {
    Loop loop = Loop::area;
    const int16_t* bank = nullptr;
    int T = 0;
    bool clamp = false;
};

VerticalChoice choose_vertical(int vfilter, int vs, int32_t vstep16)
{
    VerticalChoice v;
    const auto bank = [&](const int16_t (*b)[16][16], int scale, int T, bool clamp) {
        v.bank = &b[scale - 16][0][0];
        v.T = T;
        v.loop = T == 1 ? Loop::two_taps : Loop::wide;
        v.clamp = clamp;
    };
    const auto soft = [&]() { bank(BANK_SOFT, vs, (vs >> 4) + 1, false); };
    switch (vfilter) {
    case 0:
        break;
    case 1:
        if (vs <= 16)
            v.loop = Loop::linear;
        else if (vs <= 127)
            bank(BANK_LINEAR, vs, (vs >> 4) + 1, false);
        break;
    case 2:
        if (vs <= 16)
            bank(BANK_CUBIC, 16, 2, true);
        else if (vs <= 63)
            bank(BANK_CUBIC, vs, (vs >> 3) + 1, true);
        else if (vs <= 127)
            soft();
        break;
    case 3:
        if (vs <= 16)
            bank(BANK_SOFT, 16, 1, false);
        else if (vs <= 127)
            soft();
        break;
    case 4:
        if (vs <= 16)
            bank(BANK_LANCZOS2, 16, 2, true);
        else if (vs <= 63)
            bank(BANK_LANCZOS2, vs, ((vs - 1) >> 3) + 1, true);
        else if (vs <= 127)
            soft();
        break;
    case 5:
        if (vs <= 16)
            bank(BANK_LANCZOS3, 16, 3, true);
        else if (vs <= 42)
            bank(BANK_LANCZOS3, vs, vs <= 21 ? 4 : vs <= 26 ? 5 : vs <= 32 ? 6 : vs <= 37 ? 7 : 8, true);
        else if (vs <= 63)
            bank(BANK_LANCZOS2, vs, (vs >> 3) + 1, true);
        else if (vs <= 127)
            soft();
        break;
    case 6:
        if (vstep16 <= 0x10000) bank(BANK_LANCZOS4, 16, 4, true);
        break;
    case 7:
        if (vstep16 <= 0x10000) {
            v.loop = Loop::edge;
            v.clamp = true;
        }
        break;
    }
    return v;
}

}  // namespace

bool draw_lines(Call& k, const Plan& plan)
{
    MapContext& c = k.ctx;
    const int32_t vstep16 = trunc_i32(k.vstep * 65536.0 + 0.5);
    const int32_t vs = (k.flags.vsoften_numerator * (vstep16 >> 12)) >> 3;
    const VerticalChoice v = choose_vertical(k.flags.vfilter, vs, vstep16);

    if (v.loop == Loop::edge && ((*k.vtable)[vslot::edge] == nullptr || k.alpha_vtable)) return false;
    if (v.clamp) c.clamp = 1;
    c.vbank = v.bank;
    c.src_stride = k.src_stride;
    c.src_stride2 = k.src_alpha_stride;

    const Source src{k.src_data, k.has_alpha ? k.src_alpha : nullptr, k.src_stride, k.src_alpha_stride,
                     k.src_height};
    const int32_t f = k.Y0 & 0x3FFF;
    const double p = (0x2000 - f) * (k.vstep / 16384.0) + k.sy0 - 0.5;
    const int32_t vpos = trunc_i32(p * 65536.0);

    switch (v.loop) {
    case Loop::linear: {
        LinearSelect s{k, src, vpos, vstep16};
        walk(k, plan, s);
        break;
    }
    case Loop::two_taps: {
        TwoTapSelect s{{k, src, 2048 + vpos, vstep16}};
        walk(k, plan, s);
        break;
    }
    case Loop::wide: {
        WideSelect s{k, src, 2048 + vpos, vstep16, v.T};
        walk(k, plan, s);
        break;
    }
    case Loop::edge: {
        EdgeSelect s{k, src, 2048 + vpos, vstep16};
        walk(k, plan, s);
        break;
    }
    case Loop::area: {
        AreaSelect s(k, src, f);
        walk(k, plan, s);
        break;
    }
    }
    return true;
}

}  // namespace lorvex::rectangle
