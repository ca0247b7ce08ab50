// The horizontal plan of map_rectangle, tested directly: the call is prepared
// as the entry point prepares it (flags, pairing values, horizontal clip), the
// plan is made, and its records are checked against what they must mean: which
// filter row and kernel serve the scale, strips that tile the span and fit the
// line buffer, source ranges that hold every pixel a filter reaches, and
// constant regions exactly where the filter no longer reaches the source.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <sstream>
#include <string>

#include "lorvex.h"
#include "rectangle/rectangle.h"
#include "shared/banks.h"

namespace lorvex::rectangle {
namespace {

int16_t g_line[kLineBufferElements];

struct Span {
    uint8_t format;
    int32_t src_width;
    int32_t dst_width;
    float x0, x1;    // destination span
    float sx0, sx1;  // source span
    uint32_t flags;
};

std::string describe(const Span& s) {
    std::ostringstream o;
    o << (s.format == FORMAT_RGBQ ? "RGBQ" : s.format == FORMAT_W210 ? "W210" : "YUY2") << " source "
      << s.src_width << " [" << s.sx0 << ", " << s.sx1 << ") into " << s.dst_width << " [" << s.x0 << ", "
      << s.x1 << ") flags 0x" << std::hex << s.flags;
    return o.str();
}

struct Planned {
    Call call;
    Plan plan;
    bool ok = false;
};

// Prepares the horizontal part of a call the way the entry point does.
void plan_span(const Span& sp, Planned& p) {
    Call& k = p.call;
    k.flags = decode_flags(int32_t(sp.flags));
    const bool pairs = sp.format != FORMAT_RGBQ;
    k.pixel_words = pairs ? 2 : 4;
    k.chroma_factor = pairs ? 1 : 0;
    k.chroma_spacing = pairs ? 2 : 1;
    k.chroma_soften = pairs ? k.flags.chroma_soften : 0;
    k.ctx.line = g_line;
    k.ctx.line_a = g_line;
    k.src_width = sp.src_width;
    k.dst_width = sp.dst_width;

    float x0 = sp.x0, x1 = sp.x1;
    double sx0 = sp.sx0;
    k.hstep = (double(sp.sx1) - sx0) / double(x1 - x0);
    if (x0 < 0) {
        sx0 += 0.0 - double(x0) * k.hstep;
        x0 = 0;
    }
    if (x1 > float(sp.dst_width)) x1 = float(sp.dst_width);
    k.X0 = int32_t(x0 * 65536.0f);
    k.X1 = int32_t(x1 * 65536.0f);
    k.W16 = k.X1 - k.X0;
    k.step16 = int32_t(k.hstep * 65536.0 + 0.5);
    k.ctx.hstep = k.step16;
    k.count = ((k.X1 + 0xFFFF) >> 16) - (k.X0 >> 16);
    k.sx0 = sx0;
    p.ok = plan_horizontal(k, p.plan);
}

const int16_t* row(const int16_t (*bank)[16][16], int r) { return &bank[r][0][0]; }

// ---------------------------------------------------------------------------
// Filter choice

struct Choice {
    uint8_t format;
    int hfilter;
    int chroma_soften;
    float hstep;          // source pixels per destination pixel
    int slot;
    const int16_t* luma;  // expected rows; null: no bank, or not checked
    const int16_t* chroma;
    bool clamp;
};

TEST(Plan, FilterChoiceFollowsKindAndScale) {
    const Choice cases[] = {
        // 1:1: soft takes its first row, linear the bankless kernel, the
        // magnification-only kinds the area path.
        {FORMAT_YUY2, 3, 0, 1.0f, 4, row(BANK_SOFT, 0), row(BANK_SOFT, 0), false},
        {FORMAT_YUY2, 1, 0, 1.0f, 3, nullptr, nullptr, false},
        {FORMAT_YUY2, 6, 0, 1.0f, 2, nullptr, nullptr, false},
        {FORMAT_YUY2, 7, 0, 1.0f, 2, nullptr, nullptr, false},
        {FORMAT_YUY2, 0, 0, 0.5f, 2, nullptr, nullptr, false},
        {FORMAT_YUY2, 6, 0, 0.5f, 7, row(BANK_LANCZOS4, 0), row(BANK_LANCZOS4, 0), true},
        {FORMAT_YUY2, 7, 0, 0.5f, 12, nullptr, nullptr, true},
        {FORMAT_YUY2, 1, 0, 0.5f, 3, nullptr, nullptr, false},  // scale raised to 16
        {FORMAT_YUY2, 2, 0, 0.5f, 5, row(BANK_CUBIC, 0), row(BANK_CUBIC, 0), true},
        // Widened chroma moves linear onto the bank: sc 22 and 18.
        {FORMAT_YUY2, 1, 3, 1.0f, 5, row(BANK_LINEAR, 0), row(BANK_LINEAR, 6), false},
        {FORMAT_YUY2, 1, 1, 1.0f, 5, row(BANK_LINEAR, 0), row(BANK_LINEAR, 2), false},
        {FORMAT_RGBQ, 1, 3, 1.0f, 3, nullptr, nullptr, false},  // no chroma filter
        // sy 126: the widest linear row, 2 x 8 taps.
        {FORMAT_YUY2, 1, 0, 7.9f, 11, row(BANK_LINEAR, 110), row(BANK_LINEAR, 110), false},
        // Cubic: luma and chroma rows apart; chroma goes soft from 32, luma from 64.
        {FORMAT_YUY2, 2, 0, 1.0f, 5, row(BANK_CUBIC, 0), row(BANK_CUBIC, 0), true},
        {FORMAT_YUY2, 2, 2, 1.5f, 7, row(BANK_CUBIC, 8), row(BANK_CUBIC, 14), true},   // sy 24, sc 30
        {FORMAT_YUY2, 2, 3, 1.5f, 7, row(BANK_CUBIC, 8), row(BANK_SOFT, 17), true},    // sy 24, sc 33
        {FORMAT_YUY2, 2, 0, 2.5f, 9, row(BANK_CUBIC, 24), row(BANK_SOFT, 24), true},   // sy 40
        {FORMAT_YUY2, 2, 0, 3.9375f, 11, row(BANK_CUBIC, 47), row(BANK_SOFT, 47), true},  // sy 63
        {FORMAT_YUY2, 2, 0, 4.0f, 8, row(BANK_SOFT, 48), row(BANK_SOFT, 48), false},   // sy 64
        {FORMAT_YUY2, 4, 0, 1.25f, 6, row(BANK_LANCZOS2, 4), row(BANK_LANCZOS2, 4), true},
        {FORMAT_YUY2, 4, 0, 2.5f, 8, row(BANK_LANCZOS2, 24), row(BANK_SOFT, 24), true},
        {FORMAT_YUY2, 4, 0, 4.0f, 8, row(BANK_SOFT, 48), row(BANK_SOFT, 48), false},
        {FORMAT_YUY2, 5, 0, 1.0f, 6, row(BANK_LANCZOS3, 0), row(BANK_LANCZOS2, 0), true},
        {FORMAT_YUY2, 5, 0, 1.875f, 9, row(BANK_LANCZOS3, 14), row(BANK_LANCZOS2, 14), true},  // sy 30
        {FORMAT_YUY2, 5, 0, 3.125f, 10, row(BANK_LANCZOS2, 34), row(BANK_SOFT, 34), true},    // sy 50
        {FORMAT_RGBQ, 5, 0, 1.0f, 6, row(BANK_LANCZOS3, 0), nullptr, true},
        {FORMAT_RGBQ, 3, 0, 1.0625f, 5, row(BANK_SOFT, 1), nullptr, false},  // sy 17
        {FORMAT_YUY2, 3, 2, 6.25f, 11, row(BANK_SOFT, 84), row(BANK_SOFT, 109), false},  // sc 125
        {FORMAT_YUY2, 3, 3, 7.5f, 11, row(BANK_SOFT, 104), row(BANK_SOFT, 111), false},  // sc 127
    };
    for (const Choice& c : cases) {
        const Span sp{c.format, 1000, 100, 0, 100, 0, 100 * c.hstep, lorvex_flag_hfilter(c.hfilter) |
                                                                          lorvex_flag_chroma_soften(c.chroma_soften)};
        Planned p;
        plan_span(sp, p);
        SCOPED_TRACE(describe(sp));
        ASSERT_TRUE(p.ok);
        EXPECT_EQ(p.plan.main_slot, c.slot);
        EXPECT_EQ(p.call.ctx.clamp != 0, c.clamp);
        if (c.luma) { EXPECT_EQ(p.call.ctx.hbank_y, c.luma); }
        if (c.chroma) { EXPECT_EQ(p.call.ctx.hbank_c, c.chroma); }
        if (c.slot == 3) {
            EXPECT_EQ(p.call.ctx.hbank_y, nullptr);
            EXPECT_EQ(p.call.ctx.hbank_c, nullptr);
        }
    }
    // A reduction of 8 (sy 128) leaves every kind for the area path, which
    // replaces hstep by destination units per source pixel.
    for (int h = 0; h < 8; ++h)
        for (uint8_t f : {FORMAT_YUY2, FORMAT_RGBQ}) {
            const Span sp{f, 1000, 100, 0, 100, 0, 800, lorvex_flag_hfilter(h) | lorvex_flag_chroma_soften(3)};
            Planned p;
            plan_span(sp, p);
            SCOPED_TRACE(describe(sp));
            ASSERT_TRUE(p.ok);
            EXPECT_EQ(p.plan.main_slot, 2);
            EXPECT_EQ(p.call.ctx.hstep, 8192);
        }
}

// ---------------------------------------------------------------------------
// Strips

int pixels_of(int32_t x16, int32_t width16) { return ((x16 + width16 + 0xFFFF) >> 16) - (x16 >> 16); }

// Checks a multi-record plan against what its records must mean. `margin` and
// `reach` are the filter's extents left and right of a position (filter path),
// or negative for the area path.
void check_plan(const Planned& p, int margin, int reach) {
    const Call& k = p.call;
    const Plan& plan = p.plan;
    const bool area = margin < 0;
    ASSERT_GE(plan.count, 1);
    ASSERT_LE(plan.count, kMaxStrips);
    const int32_t n = int32_t(k.ctx.line_a - k.ctx.line) / k.pixel_words;
    EXPECT_EQ(n, (kLineBufferElements / k.pixel_words) & ~1);

    // Where each destination pixel stands: its filter position (16.16 source
    // pixels, bias included) or its area start (destination units on the
    // source's cell scale).
    const int32_t frac = k.X0 & 0xFFFF;
    const int bias = p.plan.main_slot == 3 ? 0 : 2048;
    const int64_t pos0 = bias + int64_t(65536.0 * ((0x8000 - frac) * (k.hstep / 65536.0) + k.sx0 - 0.5));
    const int32_t dstep = int32_t(65536.0 / k.hstep + 0.5);
    const int64_t q0 = int64_t(double(dstep) * k.sx0) - frac;
    const int32_t first_px = k.X0 >> 16;
    const auto where = [&](int32_t px) {
        return area ? q0 + (int64_t(px - first_px) << 16) : pos0 + int64_t(px - first_px) * k.step16;
    };
    // Region membership by meaning: the filter does not reach the source, or
    // the pixel lies wholly within the first or from the last cell on.
    const auto left_of_source = [&](int32_t px) {
        return area ? where(px) + 0x10000 <= dstep : where(px) < -(int64_t(margin) << 16);
    };
    const auto right_of_source = [&](int32_t px) {
        return area ? where(px) >= int64_t(k.src_width - 1) * dstep
                    : where(px) > (int64_t(reach + k.src_width) << 16) - 0x10000;
    };

    int32_t cur = k.X0;
    const StripRecord& first = plan.strips[0];
    if (first.left_width16) {
        EXPECT_EQ(first.left_x16, cur);
        EXPECT_EQ(first.left_x, cur >> 16);
        EXPECT_EQ(first.left_first_cover, std::min(0x10000 - (cur & 0xFFFF), first.left_width16));
        cur += first.left_width16;
        EXPECT_EQ(cur & 0xFFFF, 0) << "a left region ends on a whole pixel";
    }
    for (int32_t px = k.X0 >> 16; px < cur >> 16; ++px) EXPECT_TRUE(left_of_source(px)) << "left region pixel " << px;

    for (int i = 0; i < plan.count; ++i) {
        const StripRecord& s = plan.strips[i];
        SCOPED_TRACE("record " + std::to_string(i));
        if (i > 0) { EXPECT_EQ(s.left_width16, 0); }
        if (i + 1 < plan.count) { EXPECT_EQ(s.right_width16, 0); }
        ASSERT_GT(s.width16, 0);
        EXPECT_EQ(s.x16, cur);
        EXPECT_EQ(s.x, s.x16 >> 16);
        EXPECT_EQ(s.first_cover, std::min(0x10000 - (s.x16 & 0xFFFF), s.width16));
        if (i > 0) { EXPECT_EQ(s.x16 & 0xFFFF, 0) << "strips meet on whole pixels"; }

        EXPECT_TRUE(s.src_first % 2 == 0 && s.pad_left % 2 == 0) << "the first source pixel is even";
        EXPECT_TRUE(0 <= s.src_first && s.src_first < s.src_end && s.src_end <= k.src_width);
        EXPECT_TRUE((s.pad_left == 0 || s.src_first == 0) && (s.pad_right == 0 || s.src_end == k.src_width));
        EXPECT_EQ(s.last, s.pad_left - s.src_first + s.src_end - 1);
        if (i > 0) {
            const StripRecord& prev = plan.strips[i - 1];
            EXPECT_TRUE(prev.src_first <= s.src_first && s.src_first < prev.src_end) << "ranges overlap";
        }
        const int32_t fill = k.pixel_words == 2 ? (s.pad_right + 1) & ~1 : s.pad_right;
        EXPECT_LE(s.last + fill + 1, n) << "the strip fits the line buffer";

        // Buffer pixel 0 is source pixel src_first - pad_left: the record's
        // phase continues the positions of the whole span.
        const int64_t origin = int64_t(s.src_first - s.pad_left);
        const int32_t step = area ? k.ctx.hstep : k.step16;
        EXPECT_EQ(origin * (area ? step : 0x10000) + s.phase, where(s.x));
        const int npx = pixels_of(s.x16, s.width16);
        for (int j = 0; j < npx; ++j) {
            const int32_t px = s.x + j;
            ASSERT_FALSE(left_of_source(px)) << "pixel " << px;
            ASSERT_FALSE(right_of_source(px)) << "pixel " << px;
            // The buffer pixels the pixel reads: the cells its span
            // overlaps, or the filter's extent around its position.
            const int64_t a = area ? (s.phase + (int64_t(j) << 16)) / step : ((s.phase + j * k.step16) >> 16) - margin;
            const int64_t b = area ? (s.phase + (int64_t(j) << 16) + 0xFFFF) / step : a + margin + reach;
            ASSERT_TRUE(a >= 0 && b <= s.last + s.pad_right) << "pixel " << px << " reads " << a << " to " << b;
        }
        cur += s.width16;
    }
    const StripRecord& last = plan.strips[plan.count - 1];
    if (last.right_width16) {
        EXPECT_EQ(last.right_x16, cur);
        EXPECT_EQ(cur & 0xFFFF, 0) << "a right region starts on a whole pixel";
        EXPECT_EQ(last.right_x, cur >> 16);
        EXPECT_EQ(last.right_first_cover, std::min(0x10000, last.right_width16));
        for (int32_t px = cur >> 16; px < (k.X1 + 0xFFFF) >> 16; ++px)
            EXPECT_TRUE(right_of_source(px)) << "right region pixel " << px;
        cur += last.right_width16;
    }
    EXPECT_EQ(cur, k.X1) << "the records tile the span";
}

TEST(Plan, StripsTileTheSpanAndHoldWhatTheFilterReads) {
    struct Case {
        Span span;
        int margin, reach;  // -1: area path
        int min_records;
    };
    const uint32_t h1 = lorvex_flag_hfilter(1), h2 = lorvex_flag_hfilter(2), h5 = lorvex_flag_hfilter(5);
    const Case cases[] = {
        // Cubic at a small reduction: sy 17, luma Ty 2, chroma Tc 2: margin 4.
        {{FORMAT_YUY2, 20000, 18000, 0, 18000, 0, 20000, h2}, 4, 6, 3},
        // Linear bankless at 1:1 from a fractional start.
        {{FORMAT_YUY2, 20000, 20000, 0.5f, 19999.5f, 0.5f, 19999.5f, h1}, 0, 2, 3},
        // Lanczos 3 on four samples at a reduction of 2: Ty 5, Tc -1.
        {{FORMAT_RGBQ, 24000, 12000, 0, 12000, 0, 24000, h5}, 5, 6, 6},
        // Beyond both ends of the source, magnified: both constant regions,
        // the right one moved to the last record.
        {{FORMAT_YUY2, 10000, 20000, 0.25f, 19000.75f, -300.5f, 10300.5f, h2}, 2, 4, 2},
        {{FORMAT_YUY2, 9000, 5000, -7.3f, 4990.6f, -20.25f, 9030.5f, h5}, 6, 8, 2},
        // Area path: reduction of 20, and a reduction of 3.3 beyond both ends.
        {{FORMAT_RGBQ, 40000, 2000, 0, 2000, 0, 40000, 0}, -1, -1, 10},
        {{FORMAT_YUY2, 30000, 9100, 0.6f, 9000.4f, -100.3f, 29900.7f, 0}, -1, -1, 3},
        // Strong magnification, on both paths.
        {{FORMAT_YUY2, 300, 9100, 0.6f, 9000.4f, -10.3f, 310.7f, lorvex_flag_hfilter(6)}, 6, 8, 1},
        {{FORMAT_YUY2, 300, 9100, 0.6f, 9000.4f, -10.3f, 310.7f, 0}, -1, -1, 1},
        // The first pixel whole on a pixel boundary; a span inside one pixel.
        {{FORMAT_YUY2, 64, 64, 3, 40, 0, 37, h2}, 2, 4, 1},
        {{FORMAT_YUY2, 64, 64, 3.25f, 3.75f, 10, 10.5f, h1}, 0, 2, 1},
        {{FORMAT_YUY2, 64, 64, 3.25f, 3.75f, 10, 10.5f, 0}, -1, -1, 1},
    };
    for (const Case& c : cases) {
        Planned p;
        plan_span(c.span, p);
        SCOPED_TRACE(describe(c.span));
        ASSERT_TRUE(p.ok);
        EXPECT_GE(p.plan.count, c.min_records);
        check_plan(p, c.margin, c.reach);
    }
}

TEST(Plan, StripCapacities) {
    // Area path, four samples, cells of 3277 units: ((4096 - 2) * 3277 -
    // 0x30000) >> 16 = 201 pixels a strip.
    Planned a;
    plan_span({FORMAT_RGBQ, 40000, 2000, 0, 2000, 0, 40000, 0}, a);
    ASSERT_TRUE(a.ok);
    EXPECT_EQ(a.call.ctx.hstep, 3277);
    ASSERT_EQ(a.plan.count, 10);
    for (int i = 0; i + 1 < a.plan.count; ++i) EXPECT_EQ(a.plan.strips[i].width16, 201 << 16);
    EXPECT_EQ(a.plan.strips[9].width16, (2000 - 9 * 201) << 16);

    // Sixteen records are the most a plan may have: one pixel more and the
    // call draws nothing. Area at a reduction of 16: 252 pixels a strip.
    Planned ok16, over;
    plan_span({FORMAT_RGBQ, 16 * 4032, 4032, 0, 4032, 0, 16 * 4032, 0}, ok16);
    ASSERT_TRUE(ok16.ok);
    EXPECT_EQ(ok16.plan.count, 16);
    plan_span({FORMAT_RGBQ, 16 * 4033, 4033, 0, 4033, 0, 16 * 4033, 0}, over);
    EXPECT_FALSE(over.ok);
}

TEST(Plan, SpansBeyondOneEndOfTheSourceTakeOneConstantRecord) {
    for (uint32_t flags : {0u, lorvex_flag_hfilter(2), lorvex_flag_hfilter(1), lorvex_flag_hfilter(6)})
        for (uint8_t format : {FORMAT_YUY2, FORMAT_RGBQ})
            for (int32_t W : {13, 14})
                for (bool right : {false, true}) {
                    // Left: [2.25, 30.5) from wholly left of the source; right:
                    // [0.5, 30.5) from wholly right of it.
                    const Span sp = right ? Span{format, W, 40, 0.5f, 30.5f, W + 10.0f, W + 50.0f, flags}
                                          : Span{format, W, 40, 2.25f, 30.5f, -50, -10, flags};
                    Planned p;
                    plan_span(sp, p);
                    SCOPED_TRACE(describe(sp));
                    ASSERT_TRUE(p.ok);
                    ASSERT_EQ(p.plan.count, 1);
                    const StripRecord& s = p.plan.strips[0];
                    EXPECT_EQ(s.width16, 0);
                    EXPECT_EQ(right ? s.left_width16 : s.right_width16, 0);
                    EXPECT_EQ(right ? s.right_x16 : s.left_x16, p.call.X0);
                    EXPECT_EQ(right ? s.right_width16 : s.left_width16, p.call.W16);
                    EXPECT_EQ(right ? s.right_x : s.left_x, right ? 0 : 2);
                    EXPECT_EQ(right ? s.right_first_cover : s.left_first_cover, right ? 0x8000 : 0xC000);
                    EXPECT_EQ(s.src_first, right ? (W - 1) & ~1 : 0);
                    EXPECT_EQ(s.src_end, right ? W : 1);
                    EXPECT_EQ(s.pad_left, 0);
                    EXPECT_EQ(s.pad_right, 0);
                    EXPECT_EQ(s.last, s.src_end - s.src_first - 1);  // the pixel the region paints
                    EXPECT_EQ(p.call.ctx.line_a, p.call.ctx.line + 16);
                }
}

}  // namespace
}  // namespace lorvex::rectangle
