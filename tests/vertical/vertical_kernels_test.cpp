// Vertical kernels against sums written out from their definitions: unit
// conversion into the line buffer, the element range of a strip, edge
// padding, bank, linear and box sums (truncating, saturating), and the
// edge-adaptive kernel of kind 7. Every buffer is surrounded by guard
// elements, so a write outside the documented range fails the test.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <random>
#include <vector>

#include "shared/banks.h"
#include "shared/map_context.h"
#include "vertical/vertical_kernels.h"

namespace lorvex {
namespace {

constexpr int16_t kGuard = 0x5A5B;
constexpr int kLead = 64;
constexpr int kElements = 1024;

// A section of the line buffer with guards on both sides.
struct Buffer {
    std::vector<int16_t> storage = std::vector<int16_t>(kLead + kElements + kLead, kGuard);
    int16_t* at() { return storage.data() + kLead; }
    int16_t operator[](int e) const { return storage[size_t(kLead + e)]; }
    bool untouched() const
    {
        return std::all_of(storage.begin(), storage.end(), [](int16_t v) { return v == kGuard; });
    }
};

// What distinguishes the tables: how a sample is stored in the source, how
// many buffer elements a pixel has, and the unit of the buffer.
struct Layout {
    const char* name;
    const VerticalKernelTable* table;
    int bytes;     // bytes per source sample
    int elements;  // buffer elements per pixel
    bool pairs;    // 4:2:2: the range ends on a whole pair
    bool alpha;    // reads the second plane, writes line_a
    int max;       // largest sample the tests feed it
    int unit;      // one line enters the buffer as sample x unit
    int shift;     // a sum with weights totalling 16384 leaves as sum >> shift
};

const Layout kLayouts[] = {
    {"V_YUY2", &V_YUY2, 1, 2, true, false, 255, 32, 9},
    {"V_W210", &V_W210, 2, 2, true, false, 1023, 8, 11},
    {"V_RGBQ", &V_RGBQ, 1, 4, false, false, 255, 32, 9},
    {"V_ALPHA", &V_ALPHA, 2, 1, false, true, 8188, 4, 12},
};

// A source plane of `rows` lines with a stride wider than the samples.
struct Source {
    int bytes;
    int samples_per_row = 256;
    int rows;
    int32_t stride;
    std::vector<uint8_t> data;

    Source(int bytes_, int rows_) : bytes(bytes_), rows(rows_), stride(samples_per_row * bytes_ + 24)
    {
        data.assign(size_t(stride) * size_t(rows), 0);
    }
    uint8_t* row(int r) { return data.data() + ptrdiff_t(stride) * r; }
    int get(int r, int e) const
    {
        const uint8_t* p = data.data() + ptrdiff_t(stride) * r + e * bytes;
        return bytes == 1 ? p[0] : p[0] | p[1] << 8;
    }
    void set(int r, int e, int v)
    {
        uint8_t* p = row(r) + e * bytes;
        p[0] = uint8_t(v);
        if (bytes == 2) p[1] = uint8_t(v >> 8);
    }
    void fill_random(std::mt19937& rng, int max)
    {
        for (int r = 0; r < rows; ++r)
            for (int e = 0; e < samples_per_row; ++e) set(r, e, int(rng() % uint32_t(max + 1)));
    }
};

// One kernel call: the context points at guarded buffers and at the source.
struct Call {
    const Layout& L;
    Source& src;
    MapContext ctx;
    StripRecord strip{};
    Buffer colour, alpha;

    Call(const Layout& layout, Source& source, int line, int32_t first, int32_t end, int32_t pad_left)
        : L(layout), src(source)
    {
        ctx.line = colour.at();
        ctx.line_a = alpha.at();
        LineSet& set = L.alpha ? ctx.lines2 : ctx.lines;
        (L.alpha ? ctx.src_stride2 : ctx.src_stride) = src.stride;
        for (int k = -7; k <= 8; ++k) set[k] = src.row(std::clamp(line + k, 0, src.rows - 1));
        strip.src_first = first;
        strip.src_end = end;
        strip.pad_left = pad_left;
        strip.last = pad_left - first + end - 1;
    }
    void run(int slot) { (*L.table)[size_t(slot)](ctx, strip); }
    Buffer& out() { return L.alpha ? alpha : colour; }
    const Buffer& other() const { return L.alpha ? colour : alpha; }

    // Source sample index of element e of the range, and the range's size.
    int source_element(int e) const { return strip.src_first * L.elements + e; }
    int count() const
    {
        const int32_t end = L.pairs ? (strip.src_end + 1) & ~1 : strip.src_end;
        return (end - strip.src_first) * L.elements;
    }

    // The range holds want(e) from element pad_left x elements on; every other
    // element of both sections still holds its guard.
    template <class Want>
    void expect_range(Want want)
    {
        const int start = strip.pad_left * L.elements, n = count();
        for (int e = -kLead; e < kElements + kLead; ++e) {
            const int v = out()[e];
            if (e >= start && e < start + n)
                ASSERT_EQ(v, want(e - start)) << L.name << " element " << e;
            else
                ASSERT_EQ(v, kGuard) << L.name << " wrote element " << e << " outside its range";
        }
        ASSERT_TRUE(other().untouched()) << L.name << " wrote the other section";
    }
};

// A sum of weights totalling 16384 leaves the vertical stage truncated
// (arithmetic shift) and saturated to 16 bits.
int leave(int64_t sum, int shift)
{
    return int(std::clamp<int64_t>(sum >> shift, -32768, 32767));
}

TEST(VerticalKernels, OneLineEntersInBufferUnitsOverTheStripRange)
{
    struct Range { int32_t first, end, pad_left; };
    const Range ranges[] = {{0, 6, 0}, {2, 7, 4}, {4, 5, 2}, {6, 31, 10}};
    std::mt19937 rng(11);
    for (const Layout& L : kLayouts) {
        Source src(L.bytes, 4);
        src.fill_random(rng, L.max);
        // A 10-bit word with bits above bit 9 is taken as it stands.
        if (L.bytes == 2) src.set(1, 9, 0x07FF);
        for (const Range& r : ranges) {
            for (int slot : {vslot::line_above, vslot::line_below}) {
                Call c(L, src, 1, r.first, r.end, r.pad_left);
                c.run(slot);
                SCOPED_TRACE(testing::Message() << "slot " << slot << " first " << r.first << " end " << r.end);
                c.expect_range([&](int e) { return src.get(1, c.source_element(e)) * L.unit; });
            }
        }
    }
}

TEST(VerticalKernels, PadLeftRepeatsTheFirstValidPixel)
{
    for (const Layout& L : kLayouts) {
        for (int32_t pad : {2, 6}) {
            Source src(L.bytes, 1);
            Call c(L, src, 0, 0, 4, pad);
            int16_t* b = c.out().at();
            for (int e = pad * L.elements; e < (pad + 2) * L.elements; ++e) b[e] = int16_t(100 + e);
            c.run(vslot::pad_left);
            for (int e = 0; e < pad * L.elements; ++e) {
                int want;
                if (L.pairs)  // Y Cb Y Cr of the first valid pair, Y of pixel pad_left
                    want = (e & 1) == 0 ? b[2 * pad] : (e & 2) == 0 ? b[2 * pad + 1] : b[2 * pad + 3];
                else
                    want = b[pad * L.elements + e % L.elements];
                ASSERT_EQ(c.out()[e], want) << L.name << " pad " << pad << " element " << e;
            }
            for (int e = (pad + 2) * L.elements; e < kElements; ++e) ASSERT_EQ(c.out()[e], kGuard) << L.name;
            for (int e = -kLead; e < 0; ++e) ASSERT_EQ(c.out()[e], kGuard) << L.name;
            ASSERT_TRUE(c.other().untouched()) << L.name;
        }
    }
}

TEST(VerticalKernels, PadRightRepeatsTheLastValidPixel)
{
    for (const Layout& L : kLayouts) {
        for (int32_t last : {6, 7}) {
            for (int32_t pad_right : {1, 3, 4}) {
                Source src(L.bytes, 1);
                Call c(L, src, 0, 0, last + 1, 0);
                c.strip.pad_right = pad_right;
                int16_t* b = c.out().at();
                for (int e = 0; e < (last + 1) * L.elements; ++e) b[e] = int16_t(100 + e);
                c.run(vslot::pad_right);
                // Pairs: the count rounds up to even and the fill is Y Cb Y Cr, Y of
                // pixel last, Cb the chroma element of pixel last - 1, Cr that of last.
                const int n = L.pairs ? (pad_right + 1) & ~1 : pad_right;
                const int from = (last + 1) * L.elements, to = (last + 1 + n) * L.elements;
                for (int e = 0; e < kElements; ++e) {
                    int want = kGuard;
                    if (e < from) {
                        want = 100 + e;
                    } else if (e < to && L.pairs) {
                        const int k = e - from;
                        want = (k & 1) == 0 ? b[2 * last] : (k & 2) == 0 ? b[2 * last - 1] : b[2 * last + 1];
                    } else if (e < to) {
                        want = b[last * L.elements + (e - from) % L.elements];
                    }
                    ASSERT_EQ(c.out()[e], want)
                        << L.name << " last " << last << " pad_right " << pad_right << " element " << e;
                }
                ASSERT_TRUE(c.other().untouched()) << L.name;
            }
        }
    }
}

// Reference bank sum over lines k = 1 - T .. T of `rows`, coefficient row[7 + k].
int bank_reference(const Source& src, const int (&rows)[16], const int16_t* row, int T, int e, int shift)
{
    int64_t sum = 0;
    for (int k = 1 - T; k <= T; ++k) sum += int64_t(row[7 + k]) * src.get(rows[k + 7], e);
    return leave(sum, shift);
}

TEST(VerticalKernels, BankKernelsSumTheirTapsByStrideAndByPointer)
{
    std::mt19937 rng(2024);
    for (const Layout& L : kLayouts) {
        // Sums stay inside 16 bits here; saturation has a test of its own.
        Source src(L.bytes, 24);
        src.fill_random(rng, std::min(L.max, 4096));
        // Phases 0..15 of a random row with negative lobes, and real bank rows.
        std::vector<int16_t> bank(256);
        for (auto& v : bank) v = int16_t(int(rng() % 3000) - 1000);
        const int16_t* banks[] = {bank.data(), BANK_LANCZOS3[5][0], BANK_LINEAR[0][0]};
        for (int T = 1; T <= 8; ++T) {
            for (int trial = 0; trial < 6; ++trial) {
                const int phase = int(rng() % 16);
                const int16_t* vbank = banks[trial % 3];
                const int16_t* row = vbank + phase * 16;
                SCOPED_TRACE(testing::Message() << L.name << " T " << T << " phase " << phase << " bank " << trial % 3);

                // Interior lines reached by stride from line 10.
                int stride_rows[16];
                for (int k = -7; k <= 8; ++k) stride_rows[k + 7] = 10 + k;
                Call by_stride(L, src, 10, 2, 13, 6);
                by_stride.ctx.vbank = vbank;
                by_stride.ctx.vphase = phase;
                by_stride.run(vslot::stride_taps + T);
                by_stride.expect_range([&](int e) {
                    return bank_reference(src, stride_rows, row, T, by_stride.source_element(e), L.shift);
                });

                // The pointer array: any lines, here a shuffle (edge lines repeat).
                int any_rows[16];
                for (int& r : any_rows) r = int(rng() % 24);
                Call by_pointer(L, src, 10, 2, 13, 6);
                LineSet& set = L.alpha ? by_pointer.ctx.lines2 : by_pointer.ctx.lines;
                for (int k = -7; k <= 8; ++k) set[k] = src.row(any_rows[k + 7]);
                by_pointer.ctx.vbank = vbank;
                by_pointer.ctx.vphase = phase;
                by_pointer.run(vslot::pointer_taps + T);
                by_pointer.expect_range([&](int e) {
                    return bank_reference(src, any_rows, row, T, by_pointer.source_element(e), L.shift);
                });

                // With the stride lines in the array the two kernels agree.
                Call same(L, src, 10, 2, 13, 6);
                same.ctx.vbank = vbank;
                same.ctx.vphase = phase;
                same.run(vslot::pointer_taps + T);
                same.expect_range([&](int e) { return by_stride.out()[6 * L.elements + e]; });
            }
        }
    }
}

TEST(VerticalKernels, BankSumsTruncateTowardMinusInfinityAndSaturate)
{
    struct Case { int coefficient, sample, taps; bool saturates; };
    for (const Layout& L : kLayouts) {
        const int one = 1 << L.shift;  // the coefficient that gives one buffer unit per sample unit
        const Case cases[] = {
            {-1, 1, 1, false},       {1, 1, 1, false},        {one - 1, 1, 1, false},
            {one, 1, 1, false},      {-one - 1, 1, 1, false}, {32767, L.max, 4, true},
            {-32768, L.max, 4, true},
        };
        for (const Case& k : cases) {
            std::vector<int16_t> bank(256, 0);
            for (int t = 0; t < k.taps; ++t) bank[size_t(16 * 3 + 7 - k.taps / 2 + 1 + t)] = int16_t(k.coefficient);
            Source src(L.bytes, 20);
            for (int r = 0; r < 20; ++r)
                for (int e = 0; e < 32; ++e) src.set(r, e, k.sample);
            const int64_t exact = int64_t(k.coefficient) * k.sample * k.taps;
            const int want = int(std::clamp<int64_t>(exact >> L.shift, -32768, 32767));
            for (int T = 2; T <= 8; ++T) {
                for (int slot : {vslot::stride_taps + T, vslot::pointer_taps + T}) {
                    // 10-bit pointer kernels may store the low 16 bits instead of
                    // saturating: a 10-bit sample cannot reach the limit.
                    if (k.saturates && slot >= 14 && L.bytes == 2 && !L.alpha) continue;
                    Call c(L, src, 10, 0, 8, 0);
                    c.ctx.vbank = bank.data();
                    c.ctx.vphase = 3;
                    c.run(slot);
                    SCOPED_TRACE(testing::Message() << "slot " << slot << " coefficient " << k.coefficient
                                                    << " x " << k.taps << " sample " << k.sample);
                    c.expect_range([&](int) { return want; });
                }
            }
        }
    }
}

TEST(VerticalKernels, LinearBlendsTwoLinesWithAQuarterOfThePhase)
{
    std::mt19937 rng(5);
    for (const Layout& L : kLayouts) {
        Source src(L.bytes, 4);
        src.fill_random(rng, L.max);
        for (int32_t vphase : {0, 1, 2, 3, 4, 0x8000, 0x8003, 0xFFFF, int32_t(rng() % 0x10000)}) {
            Call c(L, src, 1, 2, 11, 4);
            c.ctx.vphase = vphase;
            c.run(vslot::linear);
            const int w = vphase >> 2;  // w 0 is a plain copy of line 0
            SCOPED_TRACE(testing::Message() << "vphase " << vphase);
            c.expect_range([&](int e) {
                const int a = src.get(1, c.source_element(e)), b = src.get(2, c.source_element(e));
                return leave(int64_t(16384 - w) * a + int64_t(w) * b, L.shift);
            });
        }
    }
}

TEST(VerticalKernels, BoxWeighsFirstMiddleAndLastLines)
{
    struct Case { int first, step, mid, last; bool saturated_source; };
    const Case cases[] = {
        {16384, 0, 0, 0, false},     // within one line: a copy
        {10000, 0, 0, 6384, false},  // two lines
        {4000, 8192, 1, 4192, false},
        {1000, 2800, 5, 1384, false},
        {128, 128, 126, 128, true},  // the largest middle sum of bytes that fits 16 bits
        {64, 128, 127, 64, true},    // one more line: beyond 16 bits
        {128, 128, 126, 128, false},
        {64, 128, 127, 64, false},
        {512, 512, 30, 512, true},   // the same limits for 10-bit words
        {256, 512, 31, 256, true},
        {130, 129, 125, 129, false},
    };
    std::mt19937 rng(77);
    for (const Layout& L : kLayouts) {
        Source src(L.bytes, 140);
        for (const Case& k : cases) {
            ASSERT_EQ(k.first + k.mid * k.step + k.last, 16384);
            if (k.saturated_source)
                for (int r = 0; r < src.rows; ++r)
                    for (int e = 0; e < 64; ++e) src.set(r, e, L.max);
            else
                src.fill_random(rng, L.max);
            Call c(L, src, 3, 2, 9, 2);
            c.ctx.box_first = k.first;
            c.ctx.box_step = k.step;
            c.ctx.box_mid = k.mid;
            c.ctx.box_last = k.last;
            c.run(vslot::box);
            SCOPED_TRACE(testing::Message() << "box " << k.first << " + " << k.mid << " x " << k.step << " + " << k.last);
            c.expect_range([&](int e) {
                const int x = c.source_element(e);
                int64_t sum = int64_t(k.first) * src.get(3, x);
                for (int m = 1; m <= k.mid; ++m) sum += int64_t(k.step) * src.get(3 + m, x);
                if (k.mid > 0 || k.last > 0) sum += int64_t(k.last) * src.get(3 + k.mid + 1, x);
                return leave(sum, L.shift);
            });
        }
    }
}

// Kind 7, written out from its decision rules: l[0..5] are the bytes of lines
// L - 2 .. L + 3, c the six coefficients, ph the phase in sixteenths.
int edge_reference(const int16_t* c, int ph, const int* l)
{
    int64_t f = 0;
    for (int t = 0; t < 6; ++t) f += int64_t(c[t]) * l[t];
    const int F = int(f >> 9);
    const int lin = ((16 - ph) * l[2] + ph * l[3]) * 2;
    const int top = l[1] - l[0], up = l[2] - l[1], mid = l[3] - l[2], dn = l[4] - l[3], bot = l[5] - l[4];
    const auto large = [](int d) { return d >= 20 || d <= -20; };
    if ((!large(up) && !large(top)) || (!large(dn) && !large(bot))) {
        const int e_up = 2 * (16 * l[2] + ph * up), e_dn = 2 * (16 * l[3] - (16 - ph) * dn);
        const int E = std::abs(e_up - lin) < std::abs(e_dn - lin) ? e_up : e_dn;
        return std::clamp(F, std::min(E, lin), std::max(E, lin));
    }
    if (large(mid)) return F;
    if (!large(up)) {
        if (!large(dn)) return lin;
        return dn > 0 ? (top >= 20 ? F : lin) : (top <= -20 ? F : lin);
    }
    if (large(dn)) return F;
    return up > 0 ? (bot >= 20 ? F : lin) : (bot <= -20 ? F : lin);
}

const int16_t* edge_taps(int ph) { return BANK_LANCZOS3[0][ph] + 5; }

// Sets column `e` of lines 8 .. 13 (L = 10) to `l`.
void set_column(Source& src, int e, const int (&l)[6])
{
    for (int t = 0; t < 6; ++t) src.set(8 + t, e, l[t]);
}

TEST(VerticalKernels, EdgeKernelFollowsItsDecisionRules)
{
    const Layout* layouts[] = {&kLayouts[0], &kLayouts[2]};
    std::mt19937 rng(7);
    for (const Layout* L : layouts) {
        ASSERT_NE((*L->table)[vslot::edge], nullptr) << L->name;
        // Steps, ramps and flats: columns built from small and large differences.
        Source src(1, 20);
        src.fill_random(rng, 255);
        for (int e = 0; e < 64; ++e) {
            int l[6];
            l[0] = int(rng() % 256);
            for (int t = 1; t < 6; ++t) {
                static const int steps[] = {0, 3, -7, 19, -19, 20, -20, 45, -60, 120};
                l[t] = std::clamp(l[t - 1] + steps[rng() % 10], 0, 255);
            }
            set_column(src, e, l);
        }
        for (int ph = 0; ph < 16; ++ph) {
            // pad_left is not added: the samples are written from element 0.
            Call c(*L, src, 10, 4, 13, 6);
            c.ctx.vphase = ph;
            c.ctx.vbank = BANK_LINEAR[0][0];  // not read
            c.run(vslot::edge);
            const int first_byte = 4 * L->elements;
            const int n = L->pairs ? 2 * 14 - first_byte : 4 * 13 - first_byte;
            // The rest of the strip's range (its pad_left pixels' worth)
            // repeats the last pair or pixel written.
            const int tail = 6 * L->elements;
            for (int e = -kLead; e < kElements; ++e) {
                int want = kGuard;
                if (e >= 0 && e < n) {
                    const int b = first_byte + e;
                    int l[6];
                    for (int t = 0; t < 6; ++t) l[t] = src.get(8 + t, b);
                    want = (b & 1) == 0 ? edge_reference(edge_taps(ph), ph, l) : ((16 - ph) * l[2] + ph * l[3]) * 2;
                } else if (e >= n && e < n + tail) {
                    want = c.colour[e - 4];
                }
                ASSERT_EQ(c.colour[e], want) << L->name << " ph " << ph << " element " << e;
            }
        }
    }
}

TEST(VerticalKernels, EdgeKernelHandWorkedColumns)
{
    // result: 'F' the six-tap value, 'L' the linear one, 'E' F bounded between
    // Lin and the extrapolation `e` (worked out by hand for the case).
    struct Case { const char* what; int l[6]; int ph; char result; int e; };
    const Case cases[] = {
        {"curved ramp, every difference large", {0, 40, 80, 120, 180, 250}, 5, 'F', 0},
        {"small up, large top rising, large dn rising", {0, 100, 105, 110, 200, 250}, 8, 'F', 0},
        {"small up, large top falling, large dn rising", {200, 100, 105, 110, 200, 250}, 8, 'L', 0},
        {"small up and dn, large top and bottom", {0, 100, 105, 110, 115, 200}, 8, 'L', 0},
        {"large up and dn, small mid", {50, 50, 100, 105, 150, 150}, 8, 'F', 0},
        {"large up rising, small dn, falling bottom", {0, 10, 100, 105, 110, 50}, 8, 'L', 0},
        {"large up rising, small dn, rising bottom", {0, 10, 100, 105, 110, 170}, 8, 'F', 0},
        {"large up falling, small dn, falling bottom", {250, 240, 100, 95, 90, 30}, 8, 'F', 0},
        // Flat above: E_up = 2 (16 x 100 + 8 x 0) = 3200 is nearer Lin = 3280
        // than E_dn = 2 (16 x 105 - 8 x 145) = 1040; F falls below 3200.
        {"flat above a rise", {100, 100, 100, 105, 250, 250}, 8, 'E', 3200},
        // Flat above: E_up = 0, E_dn = 2 (16 x 100 - 12 x 100) = 800 = Lin.
        {"flat above a step", {0, 0, 0, 100, 200, 200}, 4, 'E', 800},
    };
    for (const Case& k : cases) {
        Source src(1, 20);
        for (int e = 0; e < 8; ++e) set_column(src, e, k.l);
        Call c(kLayouts[0], src, 10, 0, 4, 0);
        c.ctx.vphase = k.ph;
        c.run(vslot::edge);
        const int16_t* t = edge_taps(k.ph);
        int64_t f = 0;
        for (int i = 0; i < 6; ++i) f += int64_t(t[i]) * k.l[i];
        const int F = int(f >> 9), lin = ((16 - k.ph) * k.l[2] + k.ph * k.l[3]) * 2;
        const int want = k.result == 'F' ? F : k.result == 'L' ? lin : std::clamp(F, std::min(k.e, lin), std::max(k.e, lin));
        ASSERT_NE(want, k.result == 'F' ? lin : F) << k.what << ": the case does not tell the rules apart";
        EXPECT_EQ(c.colour[0], want) << k.what;
        EXPECT_EQ(c.colour[2], want) << k.what;
        EXPECT_EQ(c.colour[1], lin) << k.what << ": the second byte of a pair is linear";
    }
    // A flat picture: F = Lin = 32 v at every phase, no overshoot.
    for (int ph = 0; ph < 16; ++ph) {
        Source src(1, 20);
        for (int r = 0; r < 20; ++r)
            for (int e = 0; e < 16; ++e) src.set(r, e, 3 + 17 * e);
        for (const Layout* L : {&kLayouts[0], &kLayouts[2]}) {
            Call c(*L, src, 10, 0, 2, 0);
            c.ctx.vphase = ph;
            c.run(vslot::edge);
            for (int e = 0; e < 2 * L->elements; ++e) ASSERT_EQ(c.colour[e], 32 * (3 + 17 * e)) << L->name << " ph " << ph;
        }
    }
}

TEST(VerticalKernels, TablesHoldTheirKernelsInSlotOrder)
{
    for (const Layout& L : kLayouts) {
        const VerticalKernelTable& t = *L.table;
        for (int slot = 0; slot <= 21; ++slot) EXPECT_NE(t[size_t(slot)], nullptr) << L.name << " slot " << slot;
        EXPECT_EQ(t[vslot::line_above], t[vslot::line_below]) << L.name;
        for (int T = 1; T < 8; ++T) {
            EXPECT_NE(t[size_t(vslot::stride_taps + T)], t[size_t(vslot::stride_taps + T + 1)]) << L.name << " T " << T;
            EXPECT_NE(t[size_t(vslot::pointer_taps + T)], t[size_t(vslot::pointer_taps + T + 1)]) << L.name << " T " << T;
            EXPECT_NE(t[size_t(vslot::stride_taps + T)], t[size_t(vslot::pointer_taps + T)]) << L.name << " T " << T;
        }
        const bool has_edge = L.table == &V_YUY2 || L.table == &V_RGBQ;
        EXPECT_EQ(t[vslot::edge] != nullptr, has_edge) << L.name;
        EXPECT_EQ(t[23], nullptr) << L.name;
    }
}

}  // namespace
}  // namespace lorvex
