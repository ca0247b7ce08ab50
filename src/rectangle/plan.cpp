// The horizontal plan: once per call, how every destination line is built
// from one vertically filtered source line. It chooses the filter rows and the
// main kernel, cuts the span into strips that fit the line buffer, and sets
// apart the constant regions beyond the source's ends.
//
// Scales are in 1/16 of a source pixel per destination pixel: sy for luma
// (raised to 16: 1:1 and magnification share row 0), sc for chroma, widened
// by chroma_soften and 0 for sources without separate chroma.
//
// Two ways to plan a span. The filter path positions every destination pixel
// in 16.16 buffer pixels and filters around it with a bank row. The area path
// (kind 0, reductions of 8 or more, and kinds 6 and 7 at 1:1 or reduction)
// works in destination units, with each source pixel a cell of width dstep.
#include <algorithm>

#include "shared/banks.h"
#include "rectangle/rectangle.h"

namespace lorvex::rectangle {
namespace {

const int16_t* row_of(const int16_t (*bank)[16][16], int scale)
{
    return &bank[scale - 16][0][0];
}

// The filter choice of the filter path; `area` sends the span to the area path.
struct FilterChoice {
    bool area = false;
    const int16_t* bank_y = nullptr;
    const int16_t* bank_c = nullptr;
    int ty = 0, tc = 0;
    bool clamp = false;
    int slot = 0;
    int margin = 0;
    bool margin_from_extents = false;  // margin = max(ty, tc * chroma_spacing)
    int bias = 2048;
};

// Luma and chroma rows of kinds 2, 4 and 5, chosen apart.
void choose_luma(FilterChoice& f, int kind, int sy)
{
    if (sy >= 64) {
        f.bank_y = row_of(BANK_SOFT, sy);
        f.ty = sy >> 4;
        return;
    }
    f.clamp = true;
    if (kind == 2) {
        f.bank_y = row_of(BANK_CUBIC, sy);
        f.ty = sy == 16 ? 1 : sy >> 3;
    } else if (kind == 4 || sy >= 43) {
        f.bank_y = row_of(BANK_LANCZOS2, sy);
        f.ty = sy == 16 ? 1 : (sy - 1) >> 3;
    } else {
        f.bank_y = row_of(BANK_LANCZOS3, sy);
        f.ty = sy == 16 ? 2 : sy <= 21 ? 3 : sy <= 26 ? 4 : sy <= 32 ? 5 : sy <= 37 ? 6 : 7;
    }
}

void choose_chroma(FilterChoice& f, int kind, int sc)
{
    if (sc >= 32) {
        f.bank_c = row_of(BANK_SOFT, sc);
        f.tc = sc >> 4;
        return;
    }
    // These rows set clamp also for sources without chroma (sc of 0), whose
    // chroma row is never read.
    f.clamp = true;
    const int row_scale = std::max(sc, 16);
    if (kind == 2) {
        f.bank_c = sc >= 16 ? row_of(BANK_CUBIC, row_scale) : nullptr;
        f.tc = sc <= 16 ? 1 : sc >> 3;
    } else if (kind == 4) {
        f.bank_c = sc >= 16 ? row_of(BANK_LANCZOS2, row_scale) : nullptr;
        f.tc = sc <= 16 ? 1 : (sc - 1) >> 3;
    } else {
        f.bank_c = sc >= 16 ? row_of(BANK_LANCZOS2, row_scale) : nullptr;
        f.tc = (sc - 1) >> 3;  // -1 for a source without chroma
    }
}

FilterChoice choose_filter(int hfilter, int sy, int sc, int32_t step16, int chroma_spacing)
{
    FilterChoice f;
    const int m = std::max(sy, sc);
    const auto from_bank = [&](const int16_t (*bank)[16][16]) {
        f.bank_y = row_of(bank, sy);
        f.bank_c = sc >= 16 ? row_of(bank, sc) : nullptr;
        f.ty = sy >> 4;
        f.tc = sc >> 4;
        f.margin_from_extents = true;
    };
    switch (hfilter) {
    case 0:
        f.area = true;
        break;
    case 1:
    case 3:
        if (m >= 128) {
            f.area = true;
        } else if (m <= 16) {
            if (hfilter == 1) {
                f.slot = 3;  // linear with a 16-bit fraction, no bank, no bias
                f.bias = 0;
            } else {
                f.bank_y = f.bank_c = row_of(BANK_SOFT, 16);
                f.slot = 4;
            }
        } else {
            from_bank(hfilter == 1 ? BANK_LINEAR : BANK_SOFT);
        }
        break;
    case 2:
    case 4:
    case 5:
        if (m >= 128) {
            f.area = true;
        } else {
            choose_luma(f, hfilter, sy);
            choose_chroma(f, hfilter, sc);
            f.margin_from_extents = true;
        }
        break;
    case 6:
    case 7:
        if (step16 >= 0x10000) {
            f.area = true;
        } else {
            if (hfilter == 6) f.bank_y = f.bank_c = row_of(BANK_LANCZOS4, 16);
            f.clamp = true;
            f.slot = hfilter == 6 ? 7 : 12;
            f.margin = 3 * chroma_spacing;
        }
        break;
    }
    if (f.margin_from_extents) {
        f.slot = 4 + std::max(f.ty, f.tc);
        f.margin = std::max(f.ty, f.tc * chroma_spacing);
        if (f.margin < 0) f.area = true;
    }
    return f;
}

// Spans wholly left or right of the source: one strip of one constant region,
// over the first pixel or the last pair of the source.
void one_strip_left(Call& k, Plan& plan)
{
    StripRecord& s = plan.strips[0];
    s = StripRecord{};
    s.src_first = 0;
    s.src_end = 1;
    s.left_x16 = k.X0;
    s.left_width16 = k.W16;
    s.last = s.pad_left - s.src_first + s.src_end - 1;
    plan.count = 1;
    k.ctx.line_a = k.ctx.line + 16;
}

void one_strip_right(Call& k, Plan& plan)
{
    StripRecord& s = plan.strips[0];
    s = StripRecord{};
    s.src_first = (k.src_width - 1) & ~1;
    s.src_end = k.src_width;
    s.right_x16 = k.X0;
    s.right_width16 = k.W16;
    s.last = s.src_end - s.src_first - 1;
    plan.count = 1;
    k.ctx.line_a = k.ctx.line + 16;
}

// The source range of a strip from its first (possibly negative) even pixel f
// and its end e, padding what lies beyond the source.
void set_source_range(StripRecord& s, int64_t f, int64_t e, int32_t width)
{
    if (f < 0) {
        s.pad_left = int32_t(-f);
        s.src_first = 0;
    } else {
        s.pad_left = 0;
        s.src_first = int32_t(f);
    }
    if (e > width) {
        s.pad_right = int32_t(e - width);
        s.src_end = width;
    } else {
        s.pad_right = 0;
        s.src_end = int32_t(e);
    }
    s.last = s.pad_left - s.src_first + s.src_end - 1;
}

// The destination side of a strip of c pixels starting at X0.
void set_destination_range(StripRecord& s, int32_t X0, int32_t W16, int32_t c)
{
    s.x16 = X0;
    s.width16 = std::min((c << 16) - (X0 & 0xFFFF), W16);
    s.x = X0 >> 16;
    s.first_cover = std::min(0x10000 - (X0 & 0xFFFF), s.width16);
}

// Region edges: the first region pixel's index and coverage.
void close_plan(Plan& plan)
{
    StripRecord& first = plan.strips[0];
    if (first.left_width16 != 0) {
        first.left_x = first.left_x16 >> 16;
        first.left_first_cover = std::min(0x10000 - (first.left_x16 & 0xFFFF), first.left_width16);
    }
    if (first.right_width16 != 0) {
        StripRecord& last = plan.strips[plan.count - 1];
        if (plan.count > 1) {
            last.right_x16 = first.right_x16;
            last.right_width16 = first.right_width16;
            first.right_width16 = 0;
        }
        last.right_x = last.right_x16 >> 16;
        last.right_first_cover = std::min(0x10000 - (last.right_x16 & 0xFFFF), last.right_width16);
    }
}

// Buffer capacity in pixels: each takes pixel_words colour samples and, with
// alpha, one alpha sample.
int32_t buffer_pixels(const Call& k)
{
    return (kLineBufferElements / (k.has_alpha + k.pixel_words)) & ~1;
}

bool plan_filter_path(Call& k, Plan& plan, const FilterChoice& fc)
{
    MapContext& c = k.ctx;
    const int32_t step16 = k.step16;
    const int32_t margin = fc.margin;
    const int32_t reach = margin + k.chroma_spacing;
    const int32_t upper = ((reach + k.src_width) << 16) - 0x10000;
    const int32_t lower = -(margin << 16);
    const int32_t frac = k.X0 & 0xFFFF;
    int32_t pos = fc.bias + trunc_i32(65536.0 * ((0x8000 - frac) * (k.hstep / 65536.0) + k.sx0 - 0.5));
    const int32_t pos_last = int32_t(uint32_t(k.count - 1) * uint32_t(step16) + uint32_t(pos));

    if (pos_last < lower) {
        one_strip_left(k, plan);
        close_plan(plan);
        return true;
    }
    if (pos >= upper) {
        one_strip_right(k, plan);
        close_plan(plan);
        return true;
    }

    const int32_t n = buffer_pixels(k);
    const int32_t capacity = trunc_i32(double(n - reach - margin - 2) / k.hstep);
    if (capacity < 1) return false;
    c.line_a = c.line + n * k.pixel_words;

    int32_t X0 = k.X0, W16 = k.W16, count = k.count;
    StripRecord& first = plan.strips[0];
    first = StripRecord{};
    if (pos < lower) {
        const int32_t kk = (lower - pos + step16 - 1) / step16;
        first.left_x16 = X0;
        first.left_width16 = (kk << 16) - frac;
        count -= kk;
        pos += kk * step16;
        X0 += first.left_width16;
        W16 -= first.left_width16;
    }
    if (pos_last > upper) {
        const int32_t kk = (pos_last - upper + step16 - 1) / step16;
        count -= kk;
        first.right_x16 = int32_t((uint32_t(k.X1) + 0xFFFFu) & 0xFFFF0000u) - (kk << 16);
        first.right_width16 = k.X1 - first.right_x16;
        W16 -= first.right_width16;
    }
    if (count <= 0) return false;

    int i = 0;
    while (count > 0) {
        if (i == kMaxStrips) return false;
        StripRecord& s = plan.strips[i];
        if (i > 0) s = StripRecord{};
        const int32_t cnt = std::min(count, capacity);
        set_destination_range(s, X0, W16, cnt);
        const int32_t f = ((pos >> 16) - margin) & ~1;
        s.phase = pos - (f << 16);
        const int64_t e = int64_t(((cnt - 1) * step16 + pos) >> 16) + reach + 1;
        set_source_range(s, f, e, k.src_width);
        pos += cnt * step16;
        X0 += s.width16;
        W16 -= s.width16;
        count -= cnt;
        ++i;
    }
    plan.count = i;
    close_plan(plan);
    return true;
}

bool plan_area_path(Call& k, Plan& plan)
{
    MapContext& c = k.ctx;
    const int32_t dstep = trunc_i32(65536.0 / k.hstep + 0.5);
    const int32_t step = std::max(dstep, 128);
    c.hstep = step;
    plan.main_slot = 2;

    const int64_t last_cell = int64_t(k.src_width - 1) * dstep;
    const int32_t frac = k.X0 & 0xFFFF;
    int64_t q0 = trunc_i64(dstep * k.sx0) - frac;
    const int64_t q1 = q0 + int64_t(int32_t(uint32_t(k.count) << 16));

    if (q1 <= dstep) {
        one_strip_left(k, plan);
        close_plan(plan);
        return true;
    }
    if (q0 >= last_cell) {
        one_strip_right(k, plan);
        close_plan(plan);
        return true;
    }

    const int32_t n = buffer_pixels(k);
    const int64_t capacity = ((int64_t(n - 2) * step) - 0x30000) >> 16;
    if (capacity < 1) return false;
    c.line_a = c.line + n * k.pixel_words;

    int32_t X0 = k.X0, W16 = k.W16, count = k.count;
    StripRecord& first = plan.strips[0];
    first = StripRecord{};
    if (dstep - q0 >= 0x10000) {
        const int32_t kk = int32_t((dstep - q0) >> 16);
        count -= kk;
        first.left_x16 = X0;
        first.left_width16 = (kk << 16) - frac;
        q0 += int64_t(kk) << 16;
        X0 += first.left_width16;
        W16 -= first.left_width16;
    }
    if (q1 - last_cell >= 0x10000) {
        const int32_t kk = int32_t((q1 - last_cell) >> 16);
        count -= kk;
        first.right_x16 = int32_t((uint32_t(k.X1) + 0xFFFFu) & 0xFFFF0000u) - (kk << 16);
        first.right_width16 = k.X1 - first.right_x16;
        W16 -= first.right_width16;
    }
    if (count <= 0) return false;

    int64_t q = q0;
    int i = 0;
    while (count > 0) {
        if (i == kMaxStrips) return false;
        StripRecord& s = plan.strips[i];
        if (i > 0) s = StripRecord{};
        const int32_t cnt = int32_t(std::min<int64_t>(count, capacity));
        set_destination_range(s, X0, W16, cnt);
        int64_t a = q - 0x8000;
        if (a < 0) a = q - step - 0x7FFF;
        const int64_t f = (a / step) & ~int64_t(1);
        s.phase = int32_t(q - f * step);
        const int64_t e = ((int64_t(cnt) << 16) + (step + 1) / 2 + step + q + 0x7FFF) / step;
        set_source_range(s, f, e, k.src_width);
        q += int64_t(cnt) << 16;
        X0 += s.width16;
        W16 -= s.width16;
        count -= cnt;
        ++i;
    }
    plan.count = i;
    close_plan(plan);
    return true;
}

}  // namespace

bool plan_horizontal(Call& k, Plan& plan)
{
    MapContext& c = k.ctx;
    const int sy_raw = k.step16 >> 12;
    const int sy = std::max(sy_raw, 16);
    int sc = sy >= 128 ? sy : std::min(((k.chroma_soften + 8) * sy) >> 3, 127);
    sc *= k.chroma_factor;

    const FilterChoice fc = choose_filter(k.flags.hfilter, sy, sc, k.step16, k.chroma_spacing);
    if (fc.area) return plan_area_path(k, plan);

    c.hbank_y = fc.bank_y;
    c.hbank_c = fc.bank_c;
    if (fc.clamp) c.clamp = 1;
    plan.main_slot = fc.slot;
    return plan_filter_path(k, plan, fc);
}

}  // namespace lorvex::rectangle
