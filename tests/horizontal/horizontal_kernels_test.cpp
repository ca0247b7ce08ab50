// Horizontal kernels of the plain tables against the walk, the samplers and
// the composition rules written out from their definitions: first random
// strips through a reference of the whole frame, then hand-worked pixels for
// each rule (exact reproduction at phase 0, chroma phases, area spans, the
// partial and whole-pixel rules, clamping, constant regions).
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <optional>
#include <random>
#include <vector>

#include "horizontal/horizontal_kernels.h"
#include "shared/map_context.h"

namespace lorvex {
namespace {

// A destination layout with the constants of its stored depth, and the
// rounding of each mix on its way out of the buffer: one sample, weights
// summing to 0x10000 and to 0x20000, bank coefficients summing to 16384.
struct Fmt {
    const char* name;
    const HorizontalKernelTable* table;
    int bytes;  // per stored sample
    bool pairs;
    int max, luma_off, chroma_off;
    int shift;  // buffer unit = sample << shift
    int64_t r16; int s16;
    int64_t r17; int s17;
    int64_t rb; int sb;
};
const Fmt kYuy2{"H_YUY2", &H_YUY2, 1, true, 255, 16, 128, 5, 0x100000, 21, 0x200000, 22, 0x40000, 19};
const Fmt kW210{"H_W210", &H_W210, 2, true, 1023, 64, 512, 3, 0x40000, 19, 0x80000, 20, 0x10000, 17};
const Fmt kRgbq{"H_RGBQ", &H_RGBQ, 1, false, 255, 0, 0, 5, 0x100000, 21, 0x200000, 22, 0x40000, 19};
const Fmt* const kFmts[] = {&kYuy2, &kW210, &kRgbq};

constexpr int kPixels = 48;

// One destination line; pixel 0 is the even pixel of a pair by its address.
struct Dest {
    const Fmt* f;
    alignas(64) std::array<uint8_t, kPixels * 4> data{};
    int get(int n) const { return f->bytes == 1 ? data[size_t(n)] : data[size_t(2 * n)] | data[size_t(2 * n + 1)] << 8; }
    void set(int n, int64_t v)
    {
        if (f->bytes == 1) data[size_t(n)] = uint8_t(v);
        else data[size_t(2 * n)] = uint8_t(v), data[size_t(2 * n + 1)] = uint8_t(v >> 8);
    }
    // Sample indices of a pixel: pairs Y, then Cb and Cr of the pair; RGBQ four.
    int luma(int x) const { return f->pairs ? 2 * x : 4 * x; }
    int cb(int x) const { return 2 * (x & ~1) + 1; }
    int cr(int x) const { return 2 * (x & ~1) + 3; }
};

struct Line {
    std::vector<int16_t> storage = std::vector<int16_t>(4096, 0);
    int16_t* at() { return storage.data() + 512; }
};

int64_t limit(const Fmt& f, int64_t v) { return std::clamp<int64_t>(v, 0, f.max); }

int32_t c14(int32_t hc, int32_t vcover, int32_t level)
{
    return int32_t((((int64_t(hc) * vcover + 32767) >> 16) * level + 2048) >> 12);
}

struct StripCase {
    int slot;
    int32_t hstep, vcover, level;
    bool tile, clamp;
    int32_t phase, first_cover, x, width16;
};

std::ostream& operator<<(std::ostream& os, const StripCase& k)
{
    return os << "{slot " << k.slot << ", hstep 0x" << std::hex << k.hstep << ", vcover " << std::dec << k.vcover
              << ", level " << k.level << ", tile " << k.tile << ", clamp " << k.clamp << ", phase 0x" << std::hex
              << k.phase << ", first_cover 0x" << k.first_cover << ", x " << std::dec << k.x << ", width16 0x"
              << std::hex << k.width16 << std::dec << "}";
}

// ---- reference of the frame -------------------------------------------------

// The tap samplers at position pos: slot 3 linear, slots 4 + T banks.
void tap_sample(const Fmt& f, int slot, const int16_t* L, const int16_t* by, const int16_t* bc, int32_t pos,
                bool chroma, int64_t s[4])
{
    const int32_t i = pos >> 16, fr = pos & 0xFFFF, ph = (pos >> 12) & 15;
    if (slot == 3) {
        const auto mix = [&](int64_t a, int64_t b) { return (a * (0x10000 - fr) + b * fr + f.r16) >> f.s16; };
        if (!f.pairs) {
            for (int e = 0; e < 4; ++e) s[e] = mix(L[4 * i + e], L[4 * i + 4 + e]);
            return;
        }
        s[0] = mix(L[2 * i], L[2 * i + 2]);
        if (!chroma) return;
        const int32_t j = i >> 1, u = (i & 1) ? 0x10000 - fr : 0x20000 - fr, v = (i & 1) ? 0x10000 + fr : fr;
        for (int c = 0; c < 2; ++c)
            s[1 + c] = (int64_t(L[4 * j + 1 + 2 * c]) * u + int64_t(L[4 * j + 5 + 2 * c]) * v + f.r17) >> f.s17;
        return;
    }
    const int T = slot - 4;
    const auto bank = [&](const int16_t* row, int32_t base, int spacing) {
        int64_t sum = 0;
        for (int k = -T; k <= T + 1; ++k) sum += int64_t(row[7 + k]) * L[base + k * spacing];
        return (sum + f.rb) >> f.sb;
    };
    if (!f.pairs) {
        for (int e = 0; e < 4; ++e) s[e] = bank(by + ph * 16, 4 * i + e, 4);
        return;
    }
    s[0] = bank(by + ph * 16, 2 * i, 2);
    if (!chroma) return;
    const int16_t* crow = bc + ((ph >> 1) + ((i & 1) ? 8 : 0)) * 16;
    s[1] = bank(crow, 4 * (i >> 1) + 1, 4);
    s[2] = bank(crow, 4 * (i >> 1) + 3, 4);
}

// The area sampler: each pixel consumes 0x10000 of luma width, an even pixel
// 0x20000 of chroma width, by remainder counters.
struct AreaRef {
    const Fmt& f;
    const int16_t* L;
    int32_t w, p, r, p2 = 0, r2 = 0;

    AreaRef(const Fmt& fmt, const int16_t* line, int32_t hstep, int32_t phase, bool first_even)
        : f(fmt), L(line), w(hstep), p(phase / hstep), r(hstep - phase % hstep)
    {
        if (f.pairs) {
            const int32_t v = phase + w / 2 + (first_even ? -0x8000 : 0x8000);
            p2 = v / (2 * w);
            r2 = 2 * w - v % (2 * w);
        }
    }
    void sample(bool chroma, int64_t s[4])
    {
        const int n_comp = f.pairs ? 1 : 4, stride = f.pairs ? 2 : 4;
        int64_t acc[4] = {f.r16, f.r16, f.r16, f.r16};
        for (int32_t span = 0x10000; span != 0;) {
            const int32_t n = std::min(r, span);
            for (int e = 0; e < n_comp; ++e) acc[e] += int64_t(L[p * stride + e]) * n;
            span -= n;
            if ((r -= n) == 0) ++p, r = w;
        }
        for (int e = 0; e < n_comp; ++e) s[e] = acc[e] >> f.s16;
        if (!f.pairs || !chroma) return;
        int64_t cb = f.r17, cr = f.r17;
        for (int32_t span = 0x20000; span != 0;) {
            const int32_t n = std::min(r2, span);
            cb += int64_t(L[4 * p2 + 1]) * n;
            cr += int64_t(L[4 * p2 + 3]) * n;
            span -= n;
            if ((r2 -= n) == 0) ++p2, r2 = 2 * w;
        }
        s[1] = cb >> f.s17;
        s[2] = cr >> f.s17;
    }
};

// The plain rules for the samples of pixel x (pairs: its luma, and Cb, Cr
// when `chroma`). `c` < 0 selects the whole-pixel rule.
void compose(const Fmt& f, const StripCase& k, Dest& d, int x, bool chroma, const int64_t s[4], int32_t c)
{
    const auto put = [&](int n, int64_t S, int o) {
        const int64_t D = d.get(n);
        if (c < 0)
            d.set(n, k.level == 4096 ? S : (D * (4096 - k.level) + S * k.level + 2048) >> 12);
        else if (k.tile)
            d.set(n, limit(f, D + (((S - o) * c + 8192) >> 14)));
        else
            d.set(n, (D * (16384 - c) + S * c + 8192) >> 14);
    };
    if (!f.pairs) {
        for (int e = 0; e < 4; ++e) put(4 * x + e, s[e], 0);
        return;
    }
    put(d.luma(x), s[0], f.luma_off);
    if (chroma) {
        put(d.cb(x), s[1], f.chroma_off);
        put(d.cr(x), s[2], f.chroma_off);
    }
}

void reference_main(const Fmt& f, const StripCase& k, const int16_t* L, const int16_t* by, const int16_t* bc, Dest& d)
{
    int32_t x = k.x, hc = k.first_cover, rem = k.width16, pos = k.phase;
    std::optional<AreaRef> area;
    if (k.slot == 2) area.emplace(f, L, k.hstep, k.phase, !f.pairs || x % 2 == 0);
    const auto next = [&](bool chroma, int64_t s[4]) {
        if (area) area->sample(chroma, s);
        else tap_sample(f, k.slot, L, by, bc, pos, chroma, s), pos += k.hstep;
        if (k.clamp)
            for (int e = 0; e < 4; ++e) s[e] = limit(f, s[e]);
    };
    // Runs are of pairs in 4:2:2 and in the RGBQ area kernel, else of pixels.
    const int run = f.pairs || k.slot == 2 ? 2 : 1;
    for (;;) {
        if (k.vcover == 16384 && hc == 0x10000 && (!f.pairs || x % 2 == 0)) {
            for (; rem >= run * 0x10000; rem -= run * 0x10000)
                for (int n = 0; n < run; ++n, ++x) {
                    int64_t s[4] = {};
                    next(n == 0, s);
                    compose(f, k, d, x, n == 0, s, -1);
                }
            if (rem == 0) return;
            hc = std::min(rem, 0x10000);
        }
        const bool even = !f.pairs || x % 2 == 0;
        int64_t s[4] = {};
        next(even, s);
        compose(f, k, d, x, even, s, c14(hc, k.vcover, k.level));
        if ((rem -= hc) == 0) return;
        ++x;
        hc = std::min(rem, 0x10000);
    }
}

// One call of a table slot on a guarded destination.
struct Call {
    const Fmt& f;
    MapContext ctx;
    StripRecord s{};
    Line line;
    Dest dest;

    explicit Call(const Fmt& fmt) : f(fmt)
    {
        dest.f = &f;
        ctx.line = line.at(), ctx.dst_line = dest.data.data();
        ctx.hstep = 0x10000, ctx.vcover = 16384, ctx.level = 4096;
    }
    void main(const StripCase& k)
    {
        ctx.hstep = k.hstep, ctx.vcover = k.vcover, ctx.level = k.level;
        ctx.tile = k.tile, ctx.clamp = k.clamp;
        s.phase = k.phase, s.first_cover = k.first_cover, s.x = k.x, s.width16 = k.width16;
        (*f.table)[size_t(k.slot)](ctx, s);
    }
    int16_t& luma(int n) { return ctx.line[f.pairs ? 2 * n : 4 * n]; }
    int16_t& cb(int j) { return ctx.line[4 * j + 1]; }
    int16_t& cr(int j) { return ctx.line[4 * j + 3]; }
};

// Fills phases of a bank row: non-negative taps summing to at most 16384, or
// taps with negative lobes.
std::vector<int16_t> random_bank(std::mt19937& rng, bool negative_lobes)
{
    std::vector<int16_t> bank(256);
    for (int ph = 0; ph < 16; ++ph)
        for (int t = 0; t < 16; ++t)
            bank[size_t(ph * 16 + t)] = negative_lobes ? int16_t(int(rng() % 9000) - 3000) : int16_t(rng() % 1025);
    return bank;
}

TEST(HorizontalKernels, MainKernelsFollowTheWalkOnRandomStrips)
{
    const uint32_t seed = 31337;
    std::mt19937 rng(seed);
    for (const Fmt* f : kFmts) {
        for (int slot = 2; slot <= 11; ++slot) {
            for (int index = 0; index < 300; ++index) {
                StripCase k{};
                k.slot = slot;
                k.clamp = rng() % 2;
                k.tile = rng() % 3 == 0;
                k.vcover = rng() % 4 == 0 ? int32_t(1 + rng() % 16384) : 16384;
                k.level = rng() % 3 == 0 ? int32_t(4 * (1 + rng() % 1024)) : 4096;
                k.x = int32_t(rng() % 6);
                const int32_t fraction = rng() % 2 ? 0 : int32_t(rng() % 0x10000);
                k.width16 = rng() % 3 == 0 ? int32_t(0x10000 * (1 + rng() % 12)) : int32_t(1 + rng() % (12 * 0x10000));
                k.first_cover = std::min(0x10000 - fraction, k.width16);
                if (slot == 2) {
                    k.hstep = int32_t(0x2000 + rng() % 0x3E000);
                    // The first chroma index is not negative: v > -2 hstep.
                    k.phase = std::max(0, 0x8000 - 2 * k.hstep) + int32_t(rng() % uint32_t(20 * k.hstep));
                } else {
                    k.hstep = int32_t(0x1000 + rng() % 0x30000);
                    k.phase = int32_t((40 << 16) + rng() % 0x10000);
                }
                Call c(*f);
                // Without clamp the samples stay within range: in-range buffer and
                // banks without negative lobes; with it, anything goes.
                for (auto& v : c.line.storage)
                    v = k.clamp ? int16_t(int(rng() % 14000) - 3000) : int16_t(rng() % uint32_t((f->max << f->shift) + 1));
                const auto by = random_bank(rng, k.clamp), bc = random_bank(rng, k.clamp);
                c.ctx.hbank_y = by.data();
                c.ctx.hbank_c = bc.data();
                for (int n = 0; n < kPixels * (f->pairs ? 2 : 4); ++n) c.dest.set(n, rng() % uint32_t(f->max + 1));
                Dest want = c.dest;
                reference_main(*f, k, c.line.at(), by.data(), bc.data(), want);
                c.main(k);
                for (int n = 0; n < kPixels * (f->pairs ? 2 : 4); ++n)
                    ASSERT_EQ(c.dest.get(n), want.get(n))
                        << f->name << " sample " << n << ", seed " << seed << " case " << index << ": " << k;
            }
        }
    }
}

TEST(HorizontalKernels, ConstantRegionsFollowTheirWalkOnRandomStrips)
{
    const uint32_t seed = 4242;
    std::mt19937 rng(seed);
    for (const Fmt* f : kFmts) {
        for (bool right : {false, true}) {
            for (int index = 0; index < 400; ++index) {
                Call c(*f);
                for (auto& v : c.line.storage) v = int16_t(int(rng() % 12000) - 2000);
                for (int n = 0; n < kPixels * (f->pairs ? 2 : 4); ++n) c.dest.set(n, rng() % uint32_t(f->max + 1));
                StripCase k{};
                k.vcover = rng() % 4 == 0 ? int32_t(1 + rng() % 16384) : 16384;
                k.level = rng() % 3 == 0 ? int32_t(4 * (1 + rng() % 1024)) : 4096;
                k.tile = rng() % 2;
                k.x = int32_t(rng() % 8);
                k.width16 = int32_t(1 + rng() % (10 * 0x10000));
                k.first_cover = std::min(int32_t(1 + rng() % 0x10000), k.width16);
                c.ctx.vcover = k.vcover, c.ctx.level = k.level, c.ctx.tile = k.tile;
                c.s.pad_left = int32_t(2 * (1 + rng() % 10));
                c.s.last = int32_t(2 + rng() % 40);
                (right ? c.s.right_x : c.s.left_x) = k.x;
                (right ? c.s.right_first_cover : c.s.left_first_cover) = k.first_cover;
                (right ? c.s.right_width16 : c.s.left_width16) = k.width16;

                // The samples, truncated to stored depth and limited, are read once.
                const int16_t* L = c.line.at();
                const int32_t at = right ? c.s.last : c.s.pad_left;
                int64_t v[4];
                if (f->pairs) {
                    v[0] = L[2 * at];
                    v[1] = right ? L[2 * at - 1] : L[2 * at + 1];
                    v[2] = right ? L[2 * at + 1] : L[2 * at + 3];
                    v[3] = 0;
                } else {
                    for (int e = 0; e < 4; ++e) v[e] = L[4 * at + e];
                }
                for (auto& s : v) s = limit(*f, s >> f->shift);
                Dest want = c.dest;
                for (int32_t x = k.x, hc = k.first_cover, rem = k.width16;; ++x) {
                    const int32_t w = c14(hc, k.vcover, k.level);
                    if (!f->pairs && k.tile) {  // RGBQ tile: the unclamped sums run on
                        for (int e = 0; e < 4; ++e) {
                            const int64_t sum = want.get(4 * x + e) + ((v[e] * w + 8192) >> 14);
                            want.set(4 * x + e, limit(*f, sum));
                            v[e] = sum;
                        }
                    } else {
                        compose(*f, k, want, x, !f->pairs || x % 2 == 0, v, w);
                    }
                    if ((rem -= hc) <= 0) break;
                    hc = std::min(rem, 0x10000);
                }
                (*f->table)[right ? 1 : 0](c.ctx, c.s);
                for (int n = 0; n < kPixels * (f->pairs ? 2 : 4); ++n)
                    ASSERT_EQ(c.dest.get(n), want.get(n)) << f->name << (right ? " right" : " left") << " sample " << n
                                                          << ", seed " << seed << " case " << index << ": " << k
                                                          << " pad_left " << c.s.pad_left << " last " << c.s.last;
            }
        }
    }
}

// ---- hand-worked pixels -----------------------------------------------------

// An interpolating bank at phase 0 and a linear fraction of 0 reproduce the
// buffer sample with one rounding: (L + 16) >> 5, or (L + 4) >> 3 at 10 bits.
TEST(HorizontalKernels, PhaseZeroReproducesTheBufferSample)
{
    std::mt19937 rng(3);
    std::vector<int16_t> bank(256);
    for (auto& t : bank) t = int16_t(int(rng() % 4000) - 1000);  // other phases: noise
    for (int t = 0; t < 16; ++t) bank[size_t(t)] = t == 7 ? 16384 : 0;
    for (const Fmt* f : kFmts) {
        for (int slot = 2; slot <= 11; ++slot) {
            Call c(*f);
            for (auto& v : c.line.storage) v = int16_t(rng() % uint32_t((f->max << f->shift) + 1));
            c.ctx.hbank_y = c.ctx.hbank_c = bank.data();
            c.main({slot, 0x10000, 16384, 4096, false, false, 10 << 16, 0x10000, 2, 6 << 16});
            const int half = 1 << (f->shift - 1);
            for (int n = 0; n < 6; ++n) {
                const int x = 2 + n;
                if (f->pairs) {
                    EXPECT_EQ(c.dest.get(c.dest.luma(x)), (c.luma(10 + n) + half) >> f->shift) << f->name << " slot " << slot;
                    if (x % 2) continue;
                    EXPECT_EQ(c.dest.get(c.dest.cb(x)), (c.cb(5 + n / 2) + half) >> f->shift) << f->name << " slot " << slot;
                    EXPECT_EQ(c.dest.get(c.dest.cr(x)), (c.cr(5 + n / 2) + half) >> f->shift) << f->name << " slot " << slot;
                } else {
                    for (int e = 0; e < 4; ++e)
                        EXPECT_EQ(c.dest.get(4 * x + e), (c.ctx.line[4 * (10 + n) + e] + half) >> f->shift) << "slot " << slot;
                }
            }
        }
    }
}

TEST(HorizontalKernels, LinearChromaWeighsPairsInUnitsOfTwoPixels)
{
    for (const Fmt* f : {&kYuy2, &kW210}) {
        struct Case { int32_t pos; int64_t w0, w1; };  // weights of chroma j = 3 and j = 4
        // At odd i with f = 0 the chroma position lies half-way: the mean of the two.
        for (const Case& k : {Case{7 << 16, 0x10000, 0x10000}, Case{(6 << 16) + 0x4000, 0x1C000, 0x4000},
                              Case{(7 << 16) + 0x4000, 0xC000, 0x14000}}) {
            Call c(*f);
            c.cb(3) = 1000, c.cb(4) = 3001, c.cr(3) = 8000, c.cr(4) = 17;
            c.main({3, 0x10000, 16384, 4096, false, false, k.pos, 0x10000, 0, 0x10000});
            EXPECT_EQ(c.dest.get(c.dest.cb(0)), (1000 * k.w0 + 3001 * k.w1 + f->r17) >> f->s17) << f->name;
            EXPECT_EQ(c.dest.get(c.dest.cr(0)), (8000 * k.w0 + 17 * k.w1 + f->r17) >> f->s17) << f->name;
        }
    }
}

// Bank rows whose phase r weighs (16384 - 64 r, 64 r) make the row visible:
// between 0 and 8160 units the sample is r itself.
TEST(HorizontalKernels, BankPhaseRowsFollowTheSourcePixel)
{
    std::vector<int16_t> bank(256, 0);
    for (int r = 0; r < 16; ++r) bank[size_t(16 * r + 7)] = int16_t(16384 - 64 * r), bank[size_t(16 * r + 8)] = int16_t(64 * r);
    for (int slot : {4, 7, 11}) {
        for (int i = 20; i <= 21; ++i) {
            for (int ph = 0; ph < 16; ++ph) {
                Call c(kYuy2);
                c.ctx.hbank_y = c.ctx.hbank_c = bank.data();
                for (int n = 0; n < 64; ++n) c.luma(n) = n % 2 ? 8160 : 0;
                for (int j = 0; j < 32; ++j) c.cb(j) = j % 2 ? 8160 : 0, c.cr(j) = j % 2 ? 0 : 8160;
                // Fractions below 0x1000 do not change the phase.
                c.main({slot, 0x10000, 16384, 4096, false, false, (i << 16) + (ph << 12) + 0xABC, 0x10000, 0, 0x10000});
                const int row = (ph >> 1) + (i % 2 ? 8 : 0);
                EXPECT_EQ(c.dest.get(0), i % 2 ? 255 - ph : ph) << "luma, slot " << slot << " i " << i << " ph " << ph;
                EXPECT_EQ(c.dest.get(1), row) << "Cb, slot " << slot << " i " << i << " ph " << ph;
                EXPECT_EQ(c.dest.get(3), 255 - row) << "Cr, slot " << slot << " i " << i << " ph " << ph;
            }
        }
    }
}

TEST(HorizontalKernels, AreaHalvingAveragesPairsOfSamples)
{
    for (const Fmt* f : kFmts) {
        Call c(*f);
        for (int e = 0; e < 256; ++e) c.ctx.line[e] = int16_t((e * 797) % 8161);
        c.main({2, 0x8000, 16384, 4096, false, false, 0x20000, 0x10000, 0, 4 << 16});
        const int16_t* L = c.ctx.line;
        for (int x = 0; x < 4; ++x) {
            const int a = 4 + 2 * x;  // source samples a and a + 1 fall under pixel x
            for (int e = 0; e < (f->pairs ? 1 : 4); ++e) {
                const int stride = f->pairs ? 2 : 4;
                EXPECT_EQ(c.dest.get(f->pairs ? 2 * x : 4 * x + e),
                          (int64_t(L[a * stride + e]) * 0x8000 + int64_t(L[(a + 1) * stride + e]) * 0x8000 + f->r16) >> f->s16)
                    << f->name << " pixel " << x;
            }
            if (!f->pairs || x % 2) continue;
            // v = 0x20000 + 0x4000 - 0x8000: chroma 1 has 0x4000 left, then 2, then 3.
            for (int e : {1, 3}) {
                const int j = 1 + x;
                EXPECT_EQ(c.dest.get(2 * x + e), (int64_t(L[4 * j + e]) * 0x4000 + int64_t(L[4 * j + 4 + e]) * 0x10000 +
                                                  int64_t(L[4 * j + 8 + e]) * 0xC000 + f->r17) >> f->s17)
                    << f->name << " chroma " << e << " pixel " << x;
            }
        }
    }
}

// Pixel 3 is odd, whether by its index or, with the line starting three
// pixels on, by its address: parity is that of the address.
TEST(HorizontalKernels, AreaStripStartingOnAnOddPixelTakesChromaOfTheNextPair)
{
    for (const Fmt* f : {&kYuy2, &kW210}) {
        for (int32_t start : {0, 3}) {
            Call c(*f);
            for (int e = 0; e < 64; ++e) c.ctx.line[e] = int16_t(40 * e + 7);
            for (int n = 0; n < 16; ++n) c.dest.set(n, 99);
            c.ctx.dst_line += 2 * f->bytes * start;
            // Pixels 3, 4 and 5 at samples 3, 4 and 5 (copy scale).
            c.main({2, 0x10000, 16384, 4096, false, false, 0x30000, 0x10000, 3 - start, 3 << 16});
            const int half = 1 << (f->shift - 1);
            for (int x = 3; x <= 5; ++x) EXPECT_EQ(c.dest.get(2 * x), (c.luma(x) + half) >> f->shift) << f->name;
            EXPECT_EQ(c.dest.get(c.dest.cb(3)), 99) << f->name << " " << start << ": the odd first pixel drew chroma";
            EXPECT_EQ(c.dest.get(c.dest.cr(3)), 99) << f->name << " " << start << ": the odd first pixel drew chroma";
            // v = 0x30000 + 0x8000 + 0x8000: chroma pair 2 lies wholly under pixel 4.
            EXPECT_EQ(c.dest.get(c.dest.cb(4)), (c.cb(2) + half) >> f->shift) << f->name << " " << start;
            EXPECT_EQ(c.dest.get(c.dest.cr(4)), (c.cr(2) + half) >> f->shift) << f->name << " " << start;
            EXPECT_EQ(c.dest.get(12), 99) << f->name << " " << start;
        }
    }
}

// Each case lists how pixels x, x + 1, ... are drawn: 'W' by the whole-pixel
// rule, 'P' by the partial rule with weight c of that pixel (hand-computed
// from coverage, vcover and level). Linear at f = 0 with a copy step, so S of
// pixel x is (L(x) + 16) >> 5; chroma follows the even pixel.
TEST(HorizontalKernels, WalkChoosesWholeAndPartialRules)
{
    struct Case {
        const char* what;
        int32_t x, first_cover, width16, vcover, level;
        bool tile;
        const char* rules;
        int32_t c[4];
    };
    const Case cases[] = {
        {"odd first pixel, overlay", 3, 0x10000, 3 << 16, 16384, 4096, false, "PWW", {16384}},
        {"odd first pixel, tile: added; whole pixels overwrite", 3, 0x10000, 3 << 16, 16384, 4096, true, "PWW", {16384}},
        {"partly covered line: all partial", 2, 0x10000, 3 << 16, 8192, 4096, false, "PPP", {8192, 8192, 8192}},
        {"partly covered line in tile", 2, 0x10000, 2 << 16, 8192, 4096, true, "PP", {8192, 8192}},
        {"partial first pixel, overlay", 2, 0x8000, 0x38000, 16384, 4096, false, "PPWW", {8192, 16384}},
        {"partial first pixel, tile", 2, 0x8000, 0x38000, 16384, 4096, true, "PPWW", {8192, 16384}},
        // A pair, then a whole pixel left over and a quarter, both partial.
        {"half level", 2, 0x10000, 0x34000, 16384, 2048, false, "WWPP", {0, 0, 8192, 2048}},
        {"half level, tile", 2, 0x10000, 0x34000, 16384, 2048, true, "WWPP", {0, 0, 8192, 2048}},
    };
    for (const Case& k : cases) {
        Call c(kYuy2);
        for (int n = 0; n < 32; ++n) c.luma(n) = int16_t(300 * n + 5), c.ctx.line[2 * n + 1] = int16_t(8160 - 250 * n);
        for (int n = 0; n < 32; ++n) c.dest.set(n, 60 + 5 * n);
        const Dest before = c.dest;
        c.main({3, 0x10000, k.vcover, k.level, k.tile, false, k.x << 16, k.first_cover, k.x, k.width16});
        for (int x = 0; x < 16; ++x) {
            const int at = x - k.x;
            const char rule = at >= 0 && at < int(strlen(k.rules)) ? k.rules[at] : '-';
            const auto expect = [&](int n, int S, int o, const char* which) {
                const int D = before.get(n), w = rule == 'P' ? k.c[at] : 0;
                int want = D;
                if (rule == 'W') want = k.level == 4096 ? S : (D * (4096 - k.level) + S * k.level + 2048) >> 12;
                if (rule == 'P')
                    want = k.tile ? std::clamp(D + (((S - o) * w + 8192) >> 14), 0, 255) : (D * (16384 - w) + S * w + 8192) >> 14;
                EXPECT_EQ(c.dest.get(n), want) << k.what << ", " << which << " of pixel " << x;
            };
            expect(2 * x, (c.luma(x) + 16) >> 5, 16, "luma");
            if (x % 2 == 0) {
                expect(c.dest.cb(x), (c.cb(x / 2) + 16) >> 5, 128, "Cb");
                expect(c.dest.cr(x), (c.cr(x / 2) + 16) >> 5, 128, "Cr");
            }
        }
    }
}

TEST(HorizontalKernels, ClampLimitsSamplesThatLeaveTheRange)
{
    std::vector<int16_t> bank(256, 0);
    for (int ph = 0; ph < 16; ++ph) bank[size_t(16 * ph + 7)] = 16384;
    for (const Fmt* f : kFmts) {
        for (int16_t v : {int16_t(8191 + 8 * 32), int16_t(-300)}) {
            const int want = v > 0 ? f->max : 0;
            for (int slot = 3; slot <= 11; ++slot) {
                for (bool clamp : {false, true}) {
                    // Without clamp: slots of more than 8 taps limit always, and RGBQ
                    // slots 5 to 11 limit whole pixels at level 4096.
                    const bool limited = clamp || slot >= 8 || (!f->pairs && slot >= 5);
                    if (!limited) continue;
                    Call c(*f);
                    for (auto& e : c.line.storage) e = v;
                    c.ctx.hbank_y = c.ctx.hbank_c = bank.data();
                    c.main({slot, 0x10000, 16384, 4096, false, clamp, 8 << 16, 0x10000, 0, 2 << 16});
                    for (int n = 0; n < (f->pairs ? 4 : 8); ++n)
                        EXPECT_EQ(c.dest.get(n), want) << f->name << " slot " << slot << " clamp " << clamp << " sample " << n;
                    // An odd pixel at full weight, by the partial rule.
                    if (!clamp && slot < 8) continue;
                    c.main({slot, 0x10000, 16384, 4096, false, clamp, 8 << 16, 0x10000, 3, 0x10000});
                    EXPECT_EQ(c.dest.get(f->pairs ? 6 : 12), want) << f->name << " slot " << slot << " clamp " << clamp << " partial";
                }
            }
        }
    }
}

TEST(HorizontalKernels, ConstantRegionsTruncateOnceAndWalkByCoverage)
{
    struct Case { const Fmt* f; int16_t luma, cb, cr; int want_luma, want_cb, want_cr; };
    const Case cases[] = {
        {&kYuy2, 8175, 8159, 8191, 255, 254, 255},  // 8159 would round to 255
        {&kYuy2, 8300, -5, 4111, 255, 0, 128},
        {&kW210, 8183, 8191, 8300, 1022, 1023, 1023},
        {&kW210, -3, 4100, 519, 0, 512, 64},
    };
    for (const Case& k : cases) {
        for (bool right : {false, true}) {
            Call c(*k.f);
            for (int n = 0; n < 32; ++n) c.dest.set(n, 77);
            c.s.pad_left = 4;
            c.s.last = 9;
            const int at = right ? 9 : 4;
            c.luma(at) = k.luma;
            c.ctx.line[right ? 2 * at - 1 : 2 * at + 1] = k.cb;
            c.ctx.line[right ? 2 * at + 1 : 2 * at + 3] = k.cr;
            // Pixel 3 covered by half, then 4 and 5 whole: each by the partial rule.
            (right ? c.s.right_x : c.s.left_x) = 3;
            (right ? c.s.right_first_cover : c.s.left_first_cover) = 0x8000;
            (right ? c.s.right_width16 : c.s.left_width16) = 0x28000;
            (*k.f->table)[right ? 1 : 0](c.ctx, c.s);
            const auto half = [](int D, int S) { return (D * 8192 + S * 8192 + 8192) >> 14; };
            const char* side = right ? " right" : " left";
            EXPECT_EQ(c.dest.get(6), half(77, k.want_luma)) << k.f->name << side;
            EXPECT_EQ(c.dest.get(7), 77) << k.f->name << side << ": chroma of an odd pixel";
            EXPECT_EQ(c.dest.get(8), k.want_luma) << k.f->name << side;
            EXPECT_EQ(c.dest.get(9), k.want_cb) << k.f->name << side;
            EXPECT_EQ(c.dest.get(10), k.want_luma) << k.f->name << side;
            EXPECT_EQ(c.dest.get(11), k.want_cr) << k.f->name << side;
            for (int n : {4, 5, 12, 13}) EXPECT_EQ(c.dest.get(n), 77) << k.f->name << side << " outside, sample " << n;
        }
    }
}

TEST(HorizontalKernels, TiledRgbqRegionCarriesItsRunningSum)
{
    Call c(kRgbq);
    c.s.pad_left = 2;
    c.s.left_x = 1, c.s.left_first_cover = 0x8000, c.s.left_width16 = 0x28000;
    const int16_t samples[4] = {100 * 32, 30 * 32 + 31, 0, 255 * 32};
    for (int e = 0; e < 4; ++e) c.ctx.line[8 + e] = samples[e];
    for (int n = 0; n < 32; ++n) c.dest.set(n, 50);
    c.ctx.tile = 1;
    (*kRgbq.table)[0](c.ctx, c.s);
    // The first pixel adds half of S; each next pixel adds the whole previous
    // unclamped sum: 50 + 50, 50 + 100, 50 + 150 for a sample of 100.
    const int weights[3] = {8192, 16384, 16384};
    for (int e = 0; e < 4; ++e) {
        int64_t s = samples[e] >> 5;
        for (int x = 1; x <= 3; ++x) {
            s = 50 + ((s * weights[x - 1] + 8192) >> 14);
            EXPECT_EQ(c.dest.get(4 * x + e), std::min<int64_t>(s, 255)) << "sample " << e << " pixel " << x;
        }
        EXPECT_EQ(c.dest.get(e), 50);
        EXPECT_EQ(c.dest.get(16 + e), 50);
    }
    EXPECT_EQ(c.dest.get(4 * 3), 200);
}

TEST(HorizontalKernels, TablesHoldTheirKernelsInSlotOrder)
{
    for (const Fmt* f : kFmts) {
        const HorizontalKernelTable& t = *f->table;
        for (int slot = 0; slot <= 11; ++slot) EXPECT_NE(t[size_t(slot)], nullptr) << f->name << " slot " << slot;
        for (int slot = 2; slot < 11; ++slot) EXPECT_NE(t[size_t(slot)], t[size_t(slot + 1)]) << f->name << " slot " << slot;
        EXPECT_NE(t[0], t[1]) << f->name;
        EXPECT_EQ(t[13], nullptr) << f->name;
        EXPECT_EQ(t[12] == nullptr, f == &kW210) << f->name;
        if (t[12] == nullptr) continue;
        // Kind 7's main kernel draws nothing.
        Call c(*f);
        for (auto& v : c.line.storage) v = 4000;
        for (int n = 0; n < 32; ++n) c.dest.set(n, 9);
        const Dest before = c.dest;
        c.main({12, 0x10000, 16384, 4096, false, false, 4 << 16, 0x10000, 0, 4 << 16});
        EXPECT_EQ(c.dest.data, before.data) << f->name;
    }
}

}  // namespace
}  // namespace lorvex
