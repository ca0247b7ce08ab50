// The vector horizontal kernels give the same bytes as the scalar kernels:
// for every table, every vector level this processor has and every main
// slot (area, linear, bank), random strips (widths from one pixel to many, both parities of the
// first pixel, partial and whole coverage, clamp on and off, level 4096 and
// others, tile and overlay, both destination associations) over random line
// buffers and destinations.
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

#include "horizontal/horizontal_kernels.h"
#include "shared/banks.h"
#include "shared/map_context.h"
#include "shared/simd.h"

namespace lorvex {
namespace {

struct Table {
    const char* name;
    const HorizontalKernelTable* table;
    int bytes_per_pixel;  // of the image written (colour plane, or alpha for ALPHA)
    bool alpha_only;
    bool dest_alpha;
};

const Table kTables[] = {
    {"H_YUY2", &H_YUY2, 2, false, false},           {"H_YUY2_DA", &H_YUY2_DA, 2, false, true},
    {"H_YUY2_SA", &H_YUY2_SA, 2, false, false},     {"H_YUY2_SA_DA", &H_YUY2_SA_DA, 2, false, true},
    {"H_W210", &H_W210, 4, false, false},           {"H_W210_DA", &H_W210_DA, 4, false, true},
    {"H_W210_SA", &H_W210_SA, 4, false, false},     {"H_W210_SA_DA", &H_W210_SA_DA, 4, false, true},
    {"H_RGBQ", &H_RGBQ, 4, false, false},           {"H_RGBQ_DA", &H_RGBQ_DA, 4, false, true},
    {"H_RGBQ_SA", &H_RGBQ_SA, 4, false, false},     {"H_RGBQ_SA_DA", &H_RGBQ_SA_DA, 4, false, true},
    {"H_ALPHA", &H_ALPHA, 2, true, false},
};

std::vector<SimdLevel> vector_levels()
{
    std::vector<SimdLevel> levels;
    for (SimdLevel l : {SimdLevel::sse41, SimdLevel::avx2})
        if (int(l) <= int(detected_simd_level())) levels.push_back(l);
    return levels;
}

TEST(HorizontalLevels, VectorTablesHaveTheirOwnBankKernels)
{
    const auto levels = vector_levels();
    if (levels.empty()) GTEST_SKIP() << "no vector level on this processor";
    for (SimdLevel level : levels)
        for (const Table& t : kTables) {
            const HorizontalKernelTable* v = horizontal_table_for(t.table, level);
            ASSERT_NE(v, t.table) << t.name;
            for (int slot = 4; slot <= 11; ++slot) EXPECT_NE((*v)[slot], (*t.table)[slot]) << t.name << " " << slot;
            EXPECT_EQ((*v)[13], nullptr);
            EXPECT_EQ((*v)[12] == nullptr, (*t.table)[12] == nullptr);
        }
}

// One random strip of up to `max_pixels` destination pixels through a
// table's slot at every vector level against the scalar kernel; returns the
// number of comparisons made.
// What a test fixes instead of drawing it at random.
struct Fixed {
    int slot = -1;          // -1: any main slot
    int clamp = -1;         // -1: either
    bool full = false;      // level 4096, whole lines
    bool alpha_runs = false;// source alpha in runs of telling values
    bool extremes = false;  // a few line elements anywhere in the 16-bit range
    int area_kind = -1;     // -1: any kind of area walk (see below)
    bool magnify = false;   // a step below one source pixel (filter slots)
};

int compare_random_strip(const Table& t, std::mt19937& rng, const std::vector<SimdLevel>& levels, int max_pixels,
                         int iter, const Fixed& fixed = {})
{
    const int slot = fixed.slot >= 0 ? fixed.slot : 2 + int(rng() % 10);
    const int T = slot >= 4 ? slot - 4 : 1;
    LineBuffer buffer;
    for (int16_t& v : buffer.storage) v = int16_t(int(rng() % 9000) - 400);
    if (fixed.extremes)
        for (int16_t& v : buffer.storage)
            if (rng() % 500 == 0) v = int16_t(rng());
    MapContext c;
    c.line = buffer.line();
    c.line_a = c.line + 8192;
    for (int i = 0; i < 4096; ++i) c.line_a[i] = int16_t(rng() % 5 == 0 ? rng() % 18000 : rng() % 16385);
    if (fixed.alpha_runs)
        for (int i = 0; i < 4096;) {
            // Transparent, the least visible, half, opaque, overshooting, any.
            const int16_t kinds[5] = {0, 1, 8192, 16384, int16_t(16385 + rng() % 3000)};
            const int run = 1 + int(rng() % 12), kind = int(rng() % 6);
            for (int k = 0; k < run && i < 4096; ++k, ++i)
                c.line_a[i] = kind < 5 ? kinds[kind] : int16_t(rng() % 16385);
        }
    if (fixed.extremes)
        for (int i = 0; i < 4096; ++i)
            if (rng() % 40 == 0) c.line_a[i] = int16_t(rng() % 2 ? -8193 - int(rng() % 24000) : 24576 + int(rng() % 8000));
    const int bank = int(rng() % 3);
    const int16_t* rows[3] = {&BANK_CUBIC[rng() % 49][0][0], &BANK_LANCZOS3[rng() % 28][0][0],
                              &BANK_SOFT[rng() % 113][0][0]};
    c.hbank_y = rows[bank];
    c.hbank_c = rows[(bank + 1) % 3];
    c.hstep = 0x4000 + int32_t(rng() % (fixed.magnify ? 0xC001 : 0x40000));
    c.vcover = rng() % 3 == 0 ? 1 + int32_t(rng() % 16384) : 16384;
    c.clamp = uint8_t(fixed.clamp >= 0 ? fixed.clamp : rng() % 3 == 0);
    c.tile = uint8_t(rng() % 2);
    c.dst_assoc = uint8_t(rng() % 3);
    c.level = rng() % 3 ? 4096 : 4 * int32_t(1 + rng() % 2047);
    if (fixed.full) {
        c.level = 4096;
        c.vcover = 16384;
    }

    StripRecord s{};
    s.phase = ((8 + T) << 16) + int32_t(rng() % 0x10000);
    if (slot == 2) {
        // The area walk: sometimes exactly one sample per pixel from the
        // start of a sample, sometimes a reduction.
        const int kind = fixed.area_kind >= 0 ? fixed.area_kind : int(rng() % 4);
        const bool aligned = kind == 0;
        // Aligned, any reduction, reductions of 1 to 4, and common ratios.
        const int32_t common[5] = {0xAAAA, 0xAAAB, 0x8000, 0x5555, 0xC000};
        c.hstep = kind == 0   ? 0x10000
                  : kind == 1 ? 128 + int32_t(rng() % 0x30000)
                  : kind == 2 ? 0x4000 + int32_t(rng() % 0xC000)
                              : common[rng() % 5];
        s.phase = aligned ? int32_t(rng() % 8) * 0x20000 : int32_t(rng() % 0x80000);
        if (aligned) c.vcover = 16384;
    }
    // Long strips stay inside the line buffer: the tap paths read about
    // pixels x hstep source pixels, the area path pixels / hstep.
    const int64_t source_pixels = 3000;
    const int64_t reach = slot == 2 ? (source_pixels * c.hstep) >> 16 : (source_pixels << 16) / c.hstep;
    const int pixels = 1 + int(rng() % uint32_t(std::min<int64_t>(max_pixels, std::max<int64_t>(reach, 1))));
    s.x = int32_t(rng() % 5);
    const int32_t frac = rng() % 2 ? 0 : int32_t(rng() % 0x10000);
    s.x16 = (s.x << 16) + frac;
    s.width16 = (pixels << 16) - frac - (rng() % 2 ? int32_t(rng() % 0x10000) : 0);
    if (s.width16 <= 0) s.width16 = 0x10000 - frac;
    s.first_cover = std::min(0x10000 - frac, s.width16);

    const size_t dst_bytes = size_t(s.x + pixels + 4) * t.bytes_per_pixel;
    std::vector<uint8_t> d0(dst_bytes + 64), a0((s.x + pixels + 4) * 2 + 64);
    for (auto& b : d0) b = uint8_t(rng());
    if (std::string(t.name).rfind("H_W210", 0) == 0)  // ten-bit words, as a picture holds
        for (size_t i = 1; i < d0.size(); i += 2) d0[i] &= 3;
    for (size_t i = 0; i < a0.size(); i += 2) {
        const uint16_t w = uint16_t(rng() % 4097);
        a0[i] = uint8_t(w);
        a0[i + 1] = uint8_t(w >> 8);
    }
    int compared = 0;
    for (SimdLevel level : levels) {
        std::vector<uint8_t> d1 = d0, d2 = d0, e1 = a0, e2 = a0;
        c.dst_line = t.alpha_only ? nullptr : d1.data();
        c.dst_line2 = t.alpha_only ? d1.data() : e1.data();
        (*t.table)[slot](c, s);
        c.dst_line = t.alpha_only ? nullptr : d2.data();
        c.dst_line2 = t.alpha_only ? d2.data() : e2.data();
        (*horizontal_table_for(t.table, level))[slot](c, s);
        EXPECT_EQ(d1, d2) << t.name << " slot " << slot << " level " << int(level) << " iter " << iter << " hstep "
                          << c.hstep << " phase " << s.phase << " x " << s.x << " width16 " << s.width16
                          << " vcover " << c.vcover << " level " << c.level;
        EXPECT_EQ(e1, e2) << t.name << " slot " << slot << " (alpha plane) iter " << iter;
        if (d1 != d2 || e1 != e2) return -1;
        ++compared;
    }
    return compared;
}

// `per_table` strips through each table that `keep` accepts, strip i fixed
// by fix(i), at every vector level; returns the comparisons made, or -1
// after the first difference (which compare_random_strip reports).
template <class Fix>
int compare_strips(uint32_t seed, int per_table, int max_pixels, Fix fix, bool (*keep)(const Table&) = nullptr)
{
    const auto levels = vector_levels();
    std::mt19937 rng(seed);
    int compared = 0;
    for (const Table& t : kTables) {
        if (keep && !keep(t)) continue;
        for (int i = 0; i < per_table; ++i) {
            const int n = compare_random_strip(t, rng, levels, max_pixels, i, fix(i));
            if (n < 0) return -1;
            compared += n;
        }
    }
    return compared;
}

#define LORVEX_NEED_VECTOR_LEVEL() \
    if (vector_levels().empty()) GTEST_SKIP() << "no vector level on this processor"

TEST(HorizontalLevels, VectorKernelsMatchScalarOnRandomStrips)
{
    LORVEX_NEED_VECTOR_LEVEL();
    EXPECT_GT(compare_strips(11222026, 100, 70, [](int) { return Fixed{}; }), 1000);
}

// The source-alpha tables' whole-pixel runs, in both their forms (clamp on:
// the general rule; off: the fast one), over alpha with runs of transparent,
// opaque and overshooting pixels: slots 2 to 6, clamp off and on, three each.
TEST(HorizontalLevels, SourceAlphaRunsMatchScalar)
{
    LORVEX_NEED_VECTOR_LEVEL();
    const auto fix = [](int i) {
        Fixed f;
        f.slot = 2 + i / 6;
        f.clamp = i / 3 % 2;
        f.full = true;
        f.alpha_runs = true;
        return f;
    };
    const auto source_alpha = [](const Table& t) { return std::string(t.name).find("_SA") != std::string::npos; };
    EXPECT_GT(compare_strips(5150, 30, 600, fix, +source_alpha), 50);
}

// Whole lines: runs long enough to take the vector paths through several of
// their blocks of work.
TEST(HorizontalLevels, VectorKernelsMatchScalarOnLongStrips)
{
    LORVEX_NEED_VECTOR_LEVEL();
    EXPECT_GT(compare_strips(20261122, 12, 2500, [](int) { return Fixed{}; }), 100);
}

// Area runs at any ratio, at reductions of 1 to 4 and at the common ratios
// (kinds 1 to 3, eight each), whole lines at level 4096: the closed forms of
// magnification (two samples a pixel) and of reductions up to 2 (three).
TEST(HorizontalLevels, AreaRunsMatchScalar)
{
    LORVEX_NEED_VECTOR_LEVEL();
    const auto fix = [](int i) {
        Fixed f;
        f.slot = 2;
        f.full = true;
        f.area_kind = 1 + i / 8;
        return f;
    };
    EXPECT_GT(compare_strips(3202, 24, 1500, fix), 100);
}

// Runs that work in narrower lanes while the line's elements allow it check
// them first: lines with a few elements anywhere in the 16-bit range take
// their wide forms, and must draw the same bytes (area and linear slots,
// eight each, half at level 4096 and half magnifying).
TEST(HorizontalLevels, LinesWithExtremeElementsMatchScalar)
{
    LORVEX_NEED_VECTOR_LEVEL();
    const auto fix = [](int i) {
        Fixed f;
        f.slot = 2 + i / 8;
        f.extremes = true;
        f.full = i % 2 == 0;
        f.magnify = i % 4 < 2;
        return f;
    };
    EXPECT_GT(compare_strips(1601, 16, 2500, fix), 100);
}

}  // namespace
}  // namespace lorvex
