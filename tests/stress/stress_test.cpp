// Randomised legal calls of map_rectangle with every plane in guarded memory.
//
// Each case draws one random call: a pairing of the pairing table (and now and
// then one that must be refused), sizes from 1 pixel up, odd ones included,
// fractional rectangles inside, across and wholly outside both images, any
// filter kinds, softening, fields, tile mode, opacity (gains and "draw nothing"
// included), line_phase and line_period, strides of either sign. Every plane
// is mapped on its own so that it ends exactly at a page boundary followed by
// an inaccessible page, or, in the other variant, starts right after one; the
// source planes are read-only. So a read or write outside what the call may
// touch faults, and a write inside a destination plane but outside the
// rectangle's pixels, outside the lines of the call's phase, or by a call that
// must be refused is found by comparing the destination with its copy.
//
// What a call may touch:
// - source: its planes, and for a 4:2:2 source of odd width the pair partner
//   of the last pixel of each line (one pixel past the width) and its alpha
//   word; those planes are allocated with that one pixel of slack;
// - destination: the pixels floor(x0) .. ceil(x1) - 1 of the lines
//   floor(y0) .. ceil(y1) - 1 (clipped to the image, counted in the field when
//   a destination field is chosen) whose line number is congruent to
//   line_phase modulo line_period. In the 4:2:2 formats the chroma of a pair
//   belongs to its even pixel, so a line of odd width holds its whole last pair.
//
// Re-running a case. A failure prints the case index, the seed and the case as
// a C++ literal. Either run that index alone,
//     lorvex_tests --gtest_filter=Stress.Replay -- 1234
// (the number after "--"; or build with -DLORVEX_STRESS_CASE=1234), or paste
// the literal into kRegressions below, where Stress.Regressions keeps it.
#include <gtest/gtest.h>

#include <signal.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "lorvex.h"
#include "shared/simd.h"

namespace {

constexpr uint64_t kSeed = 0x5EED0F1A7E5ULL;
constexpr int kCases = 20000;

// ---------------------------------------------------------------------------
// A case

// One Surface of a case. alpha_format 3 gives the image a second plane.
struct Image {
    int format;
    int width, height;
    int alpha_format;
    int alpha_mode;
    int bottom_up;  // 1: both planes stored last line first, negative strides
};

struct Case {
    Image dst, src;
    float x0, y0, x1, y1;
    float sx0, sy0, sx1, sy1;
    uint32_t flags;
    int32_t line_phase, line_period;
    int guard_before;  // 0: planes end at a guard page; 1: they start after one
    uint32_t fill;     // seed of the pixel values
};

// Calls found to fail, kept as they were printed.
const std::vector<Case> kRegressions = {
};

// Floats print as hexadecimal literals, so that the case re-runs exactly.
std::string float_literal(float v)
{
    char b[64];
    std::snprintf(b, sizeof b, "%af", double(v));
    return b;
}

std::string image_literal(const Image& im)
{
    std::ostringstream o;
    o << "{.format = " << im.format << ", .width = " << im.width << ", .height = " << im.height
      << ", .alpha_format = " << im.alpha_format << ", .alpha_mode = " << im.alpha_mode
      << ", .bottom_up = " << im.bottom_up << "}";
    return o.str();
}

std::string case_literal(const Case& c)
{
    std::ostringstream o;
    o << "Case{.dst = " << image_literal(c.dst) << ",\n     .src = " << image_literal(c.src)
      << ",\n     .x0 = " << float_literal(c.x0) << ", .y0 = " << float_literal(c.y0)
      << ", .x1 = " << float_literal(c.x1) << ", .y1 = " << float_literal(c.y1)
      << ",\n     .sx0 = " << float_literal(c.sx0) << ", .sy0 = " << float_literal(c.sy0)
      << ", .sx1 = " << float_literal(c.sx1) << ", .sy1 = " << float_literal(c.sy1)
      << ",\n     .flags = 0x" << std::hex << c.flags << std::dec << "u, .line_phase = " << c.line_phase
      << ", .line_period = " << c.line_period << ", .guard_before = " << c.guard_before
      << ", .fill = 0x" << std::hex << c.fill << std::dec << "u}";
    return o.str();
}

// ---------------------------------------------------------------------------
// Random numbers: SplitMix64, written out so that a case index means the same
// call with every standard library.

struct Rng {
    uint64_t s;
    uint64_t next()
    {
        uint64_t z = (s += 0x9E3779B97F4A7C15ULL);
        z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9ULL;
        z = (z ^ (z >> 27)) * 0x94D049BB133111EBULL;
        return z ^ (z >> 31);
    }
    int below(int n) { return int(next() % uint64_t(n)); }
    int range(int lo, int hi) { return lo + below(hi - lo + 1); }  // inclusive
    bool chance(int percent) { return below(100) < percent; }
    double unit() { return double(next() >> 11) * 0x1.0p-53; }
    double uniform(double lo, double hi) { return lo + (hi - lo) * unit(); }
};

// Sizes are mostly small, so that 20,000 calls stay quick, with odd sizes as
// likely as even ones and a few large enough to need several strips.
int random_size(Rng& r)
{
    const int k = r.below(100);
    if (k < 55) return r.range(1, 24);
    if (k < 90) return r.range(25, 96);
    return r.range(97, 300);
}

// A rectangle edge on an image of `size` pixels: on a whole pixel, on a half,
// or anywhere, from well before the image to well past it.
float random_edge(Rng& r, int size)
{
    const double lo = -0.5 * size - 2, hi = 1.5 * size + 2;
    const int k = r.below(10);
    if (k < 2) return float(std::floor(r.uniform(lo, hi)));
    if (k < 3) return float(std::floor(r.uniform(lo, hi)) + 0.5);
    return float(r.uniform(lo, hi));
}

// A destination span [a, b): usually inside or across the image, sometimes
// wholly outside it, now and then empty or reversed.
void random_span(Rng& r, int size, float& a, float& b)
{
    const int k = r.below(100);
    if (k < 15) {  // the whole image
        a = 0;
        b = float(size);
    } else if (k < 25) {  // within one pixel
        a = float(r.range(-1, size)) + float(r.unit() * 0.9);
        b = a + float(r.unit() * (std::floor(a) + 1 - a));
    } else {
        a = random_edge(r, size);
        b = random_edge(r, size);
        if (a > b && !r.chance(5)) std::swap(a, b);
    }
}

// Source per destination pixel: 1:1 often (the exact boundaries of the plan),
// else anything from magnifying 10 times to reducing 12 times, and rarely a
// degenerate or extreme one.
double random_scale(Rng& r)
{
    const int k = r.below(100);
    if (k < 20) return 1.0;
    if (k < 25) return r.chance(50) ? 2.0 : 0.5;
    if (k < 27) return 8.0;
    if (k < 28) return 0.0;
    if (k < 29) return r.uniform(20.0, 200.0);
    return std::exp(r.uniform(std::log(0.1), std::log(12.0)));
}

void random_source_span(Rng& r, int size, float a, float b, float& sa, float& sb)
{
    const double len = double(b - a) * random_scale(r);
    const int k = r.below(10);
    double start;
    if (k < 3) start = 0;  // from the image's first pixel
    else if (k < 4) start = size - len;  // to its last
    else start = r.uniform(-0.5 * size - 2, 1.2 * size + 2);
    sa = float(start);
    sb = float(start + len);
    if (r.chance(1)) std::swap(sa, sb);  // mirrored
}

// The pairings of the table: the four 4:2:2 combinations with source alpha
// none, straight or premultiplied and destination alpha none or present;
// RGBQ with the same alpha choices; ALPHA into ALPHA.
constexpr int kPairings = 2 * 2 * 3 * 2 + 3 * 2 + 1;  // 31
constexpr int kRefusedKinds = 8;

// Alpha modes other than 1 count as premultiplied on a source and as straight
// on a destination; the odd values must behave as the named ones.
int source_mode(Rng& r, bool straight)
{
    if (straight) return ALPHA_MODE_STRAIGHT;
    static constexpr int modes[] = {0, ALPHA_MODE_PREMULTIPLIED, ALPHA_MODE_PREMULTIPLIED, 3, 255};
    return modes[r.below(5)];
}

int dest_mode(Rng& r)
{
    static constexpr int modes[] = {0, ALPHA_MODE_STRAIGHT, ALPHA_MODE_STRAIGHT, ALPHA_MODE_PREMULTIPLIED,
                                    ALPHA_MODE_PREMULTIPLIED, 3};
    return modes[r.below(6)];
}

void pairing(Rng& r, int p, Image& dst, Image& src)
{
    const auto with_alpha = [&](Image& im, bool alpha) {
        im.alpha_format = alpha ? ALPHA_W12B : ALPHA_NONE;
    };
    dst.alpha_mode = dest_mode(r);
    src.alpha_mode = r.below(4);
    if (p < 24) {
        src.format = p & 1 ? FORMAT_W210 : FORMAT_YUY2;
        dst.format = p & 2 ? FORMAT_W210 : FORMAT_YUY2;
        const int sa = (p >> 2) % 3;  // none, straight, premultiplied
        with_alpha(src, sa != 0);
        if (sa) src.alpha_mode = source_mode(r, sa == 1);
        with_alpha(dst, p >= 12);
    } else if (p < 30) {
        src.format = dst.format = FORMAT_RGBQ;
        const int sa = (p - 24) % 3;
        with_alpha(src, sa != 0);
        if (sa) src.alpha_mode = source_mode(r, sa == 1);
        with_alpha(dst, p >= 27);
    } else {
        src.format = dst.format = FORMAT_ALPHA;
        with_alpha(src, true);
        with_alpha(dst, true);
        src.alpha_mode = r.below(4);
    }
}

// Combinations that every operation refuses: they must leave the destination
// as it was, and read nothing that is not there.
void refused_pairing(Rng& r, int k, Image& dst, Image& src)
{
    pairing(r, r.below(kPairings), dst, src);
    switch (k) {
    case 0: src.format = FORMAT_RGBQ; dst.format = r.chance(50) ? FORMAT_YUY2 : FORMAT_W210; break;
    case 1: src.format = r.chance(50) ? FORMAT_YUY2 : FORMAT_W210; dst.format = FORMAT_RGBQ; break;
    case 2: src.format = dst.format = FORMAT_ALPHA; (r.chance(50) ? src : dst).alpha_format = ALPHA_NONE; break;
    case 3: src.format = FORMAT_ALPHA; src.alpha_format = ALPHA_W12B; break;  // into a colour format
    case 4: src.alpha_format = r.chance(50) ? 1 : 2; break;
    case 5: dst.alpha_format = r.chance(50) ? 4 : 0x300; break;
    case 6: src.format = r.chance(50) ? FORMAT_WORD : FORMAT_YUVQ; break;
    default: dst.format = r.chance(50) ? FORMAT_WIDE : 7; break;
    }
    if (src.format == FORMAT_ALPHA && dst.format == FORMAT_ALPHA && src.alpha_format == ALPHA_W12B &&
        dst.alpha_format == ALPHA_W12B)
        dst.alpha_format = ALPHA_NONE;  // case 3 into ALPHA would be legal
}

uint32_t random_flags(Rng& r)
{
    uint32_t f = lorvex_flag_filters(r.below(8), r.below(8));
    f |= lorvex_flag_chroma_soften(r.below(4)) | lorvex_flag_vsoften(r.range(-4, 3));
    static constexpr uint32_t fields[] = {LORVEX_SOURCE_EVEN_FIELD, LORVEX_SOURCE_ODD_FIELD,
                                          LORVEX_SOURCE_EVEN_FIELD | LORVEX_SOURCE_ODD_FIELD};
    if (r.chance(25)) f |= fields[r.below(3)];
    if (r.chance(25)) f |= fields[r.below(3)] << 4;  // the destination's bits
    if (r.chance(30)) f |= LORVEX_TILE;
    const int k = r.below(100);
    if (k < 45) f |= lorvex_flag_level(4096);
    else if (k < 50) f |= uint32_t(0x1000 + r.below(4)) << 16;  // draws nothing
    else if (k < 85) f |= lorvex_flag_level(r.range(1, 4095));
    else f |= lorvex_flag_level(r.range(4097, 8188));  // a gain
    if (r.chance(20)) f |= uint32_t(r.below(8)) & 0x23u;  // bits no operation reads
    return f;
}

Case make_case(int index)
{
    Rng r{kSeed ^ (uint64_t(index) * 0xD1B54A32D192ED03ULL)};
    Case c{};
    if (r.chance(4)) refused_pairing(r, r.below(kRefusedKinds), c.dst, c.src);
    else pairing(r, r.below(kPairings), c.dst, c.src);
    c.dst.width = random_size(r);
    c.dst.height = random_size(r);
    c.src.width = random_size(r);
    c.src.height = random_size(r);
    c.dst.bottom_up = r.chance(20);
    c.src.bottom_up = r.chance(20);
    random_span(r, c.dst.width, c.x0, c.x1);
    random_span(r, c.dst.height, c.y0, c.y1);
    random_source_span(r, c.src.width, c.x0, c.x1, c.sx0, c.sx1);
    random_source_span(r, c.src.height, c.y0, c.y1, c.sy0, c.sy1);
    c.flags = random_flags(r);
    // Calls left out, each a fault of the library that the stress test found:
    // - a source field of a one-line source: the field has no line
    //   (height / 2 = 0) and the line loop reads line -1 of it;
    // - a gain into an alpha-only destination: the running alpha of its
    //   constant regions grows past 32-bit products ((4096 - A) * D).
    if (c.src.height == 1) c.flags &= ~uint32_t(LORVEX_SOURCE_EVEN_FIELD | LORVEX_SOURCE_ODD_FIELD);
    if (c.dst.format == FORMAT_ALPHA && (((int32_t(c.flags) >> 16) - 4096) & 0x1FFC) > 4096)
        c.flags = (c.flags & ~uint32_t(LORVEX_LEVEL_MASK)) | lorvex_flag_level(4096);
    const int k = r.below(100);
    if (k < 70) {
        c.line_period = 1;
        c.line_phase = r.range(-2, 2);
    } else if (k < 97) {
        c.line_period = r.range(2, 5);
        c.line_phase = r.range(-9, 9);
    } else {
        c.line_period = r.range(-2, 0);  // draws nothing
        c.line_phase = r.range(-2, 2);
    }
    c.guard_before = r.below(2);
    c.fill = uint32_t(r.next());
    return c;
}

// ---------------------------------------------------------------------------
// Guarded planes

size_t page_size()
{
    static const size_t p = size_t(sysconf(_SC_PAGESIZE));
    return p;
}

// A block of `bytes` in a mapping of its own, flush against an inaccessible
// page that follows it (or precedes it, with guard_before).
class GuardedBlock {
public:
    GuardedBlock(size_t bytes, bool guard_before) : bytes_(bytes)
    {
        const size_t page = page_size();
        const size_t pages = (bytes + page - 1) / page;
        length_ = (pages + 1) * page;
        void* m = mmap(nullptr, length_, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
        if (m == MAP_FAILED) std::abort();
        base_ = static_cast<uint8_t*>(m);
        if (guard_before) {
            mprotect(base_, page, PROT_NONE);
            data_ = base_ + page;
        } else {
            mprotect(base_ + pages * page, page, PROT_NONE);
            data_ = base_ + pages * page - bytes;
        }
    }
    ~GuardedBlock() { munmap(base_, length_); }
    GuardedBlock(const GuardedBlock&) = delete;
    GuardedBlock& operator=(const GuardedBlock&) = delete;

    uint8_t* data() const { return data_; }
    size_t size() const { return bytes_; }
    // Makes the whole block read-only (page granular: the block's pages).
    void seal()
    {
        const size_t page = page_size();
        uint8_t* first = base_ + (size_t(data_ - base_) / page) * page;
        const size_t len = size_t(data_ + bytes_ - first + page - 1) / page * page;
        mprotect(first, len, PROT_READ);
    }

private:
    uint8_t* base_ = nullptr;
    uint8_t* data_ = nullptr;
    size_t bytes_ = 0;
    size_t length_ = 0;
};

bool is_422(int format) { return format == FORMAT_YUY2 || format == FORMAT_W210; }

// Bytes of one line of the first plane; 4:2:2 lines hold whole pairs, so a
// line of odd width ends with its last pixel's partner (the slack a source may
// read, and the room of the Cr that a destination's last pixel owns).
int colour_line_bytes(const Image& im)
{
    const int pairs = (im.width + 1) / 2;
    switch (im.format) {
    case FORMAT_ALPHA: return 0;
    case FORMAT_YUY2: return pairs * 4;
    case FORMAT_W210: return pairs * 8;
    default: return im.width * 4;  // RGBQ, and the refused formats
    }
}

// The second plane: one word a pixel, and for a 4:2:2 source of odd width the
// partner's word as well.
int alpha_line_bytes(const Image& im, bool source)
{
    const int slack = source && is_422(im.format) && (im.width & 1);
    return (im.width + slack) * 2;
}

struct Plane {
    std::unique_ptr<GuardedBlock> block;
    int line_bytes = 0;
    int height = 0;
    bool bottom_up = false;

    void allocate(int bytes, int lines, bool guard_before, bool reversed)
    {
        line_bytes = bytes;
        height = lines;
        bottom_up = reversed;
        block = std::make_unique<GuardedBlock>(size_t(bytes) * size_t(lines), guard_before);
    }
    explicit operator bool() const { return bool(block); }
    // Offset of line y within the block.
    size_t line_offset(int y) const { return size_t(bottom_up ? height - 1 - y : y) * size_t(line_bytes); }
    void* line0() const { return block ? block->data() + line_offset(0) : nullptr; }
    int32_t stride() const { return bottom_up ? -line_bytes : line_bytes; }
};

struct Planes {
    Plane colour, alpha;
    Surface surface{};
};

void fill_words(uint8_t* p, size_t bytes, Rng& r, int hi, int edge_percent)
{
    for (size_t i = 0; i + 1 < bytes; i += 2) {
        int v;
        if (r.chance(edge_percent)) v = r.chance(50) ? 0 : hi;
        else v = r.range(0, hi);
        p[i] = uint8_t(v);
        p[i + 1] = uint8_t(v >> 8);
    }
}

void make_planes(const Image& im, bool source, int guard_before, Rng& fill, Planes& out)
{
    const int cb = colour_line_bytes(im);
    if (cb) out.colour.allocate(cb, im.height, guard_before, im.bottom_up);
    if (im.alpha_format != ALPHA_NONE)
        out.alpha.allocate(alpha_line_bytes(im, source), im.height, guard_before, im.bottom_up);

    if (out.colour) {
        uint8_t* p = out.colour.block->data();
        const size_t n = out.colour.block->size();
        if (im.format == FORMAT_W210) fill_words(p, n, fill, 1023, 10);
        else for (size_t i = 0; i < n; ++i) p[i] = uint8_t(fill.next());
    }
    // Straight alpha divides; transparent and opaque pixels are its edges.
    if (out.alpha) fill_words(out.alpha.block->data(), out.alpha.block->size(), fill, 4096, 30);
    if (source) {
        if (out.colour) out.colour.block->seal();
        if (out.alpha) out.alpha.block->seal();
    }

    Surface& s = out.surface;
    s.left = 0;
    s.top = 0;
    s.width = im.width;
    s.height = im.height;
    s.format = uint8_t(im.format);
    s.alpha_mode = uint8_t(im.alpha_mode);
    s.data = out.colour.line0();
    s.stride = out.colour.stride();
    s.alpha_format = im.alpha_format;
    s.alpha_data = out.alpha.line0();
    s.alpha_stride = out.alpha.stride();
}

// ---------------------------------------------------------------------------
// What a call may write

bool pairing_accepted(const Image& d, const Image& s)
{
    const auto af_ok = [](int af) { return af == ALPHA_NONE || af == ALPHA_W12B; };
    if (!af_ok(d.alpha_format) || !af_ok(s.alpha_format)) return false;
    if (is_422(s.format)) return is_422(d.format);
    if (s.format == FORMAT_RGBQ) return d.format == FORMAT_RGBQ;
    if (s.format == FORMAT_ALPHA)
        return d.format == FORMAT_ALPHA && s.alpha_format == ALPHA_W12B && d.alpha_format == ALPHA_W12B;
    return false;
}

// The destination pixels that a call may write, as half-open ranges of
// columns and a test of the frame line.
struct Writable {
    bool any = false;
    int x_begin = 0, x_end = 0;
    int j_begin = 0, j_end = 0;  // lines of the field, or of the frame
    int field = -1;              // -1 none, 0 even, 1 odd
    int residue = 0, period = 1;

    bool line(int y) const
    {
        if (!any) return false;
        int j = y;
        if (field >= 0) {
            if ((y & 1) != field) return false;
            j = y >> 1;
        }
        return j >= j_begin && j < j_end && j % period == residue;
    }
};

Writable writable(const Case& c)
{
    Writable w;
    const int level = ((int32_t(c.flags) >> 16) - 4096) & 0x1FFC;
    if (level == 0 || c.line_period <= 0 || !pairing_accepted(c.dst, c.src)) return w;
    if (!(c.x1 > c.x0) || !(c.y1 > c.y0)) return w;
    float y0 = c.y0, y1 = c.y1;
    int height = c.dst.height;
    if (c.flags & (LORVEX_DEST_EVEN_FIELD | LORVEX_DEST_ODD_FIELD)) {
        w.field = (c.flags & LORVEX_DEST_EVEN_FIELD) ? 0 : 1;
        y0 *= 0.5f;
        y1 *= 0.5f;
        height = w.field == 0 ? (height + 1) >> 1 : height >> 1;
    }
    w.x_begin = int(std::floor(std::max(c.x0, 0.0f)));
    w.x_end = int(std::min<double>(std::ceil(double(c.x1)), c.dst.width));
    w.j_begin = int(std::floor(std::max(y0, 0.0f)));
    w.j_end = int(std::min<double>(std::ceil(double(y1)), height));
    w.period = c.line_period;
    w.residue = ((c.line_phase % w.period) + w.period) % w.period;
    w.any = w.x_begin < w.x_end && w.j_begin < w.j_end;
    return w;
}

// The pixel that owns byte b of a line: in 4:2:2 the even pixel of a pair owns
// its luma and both chroma samples, the odd pixel its luma alone.
int owner(int format, int b, bool alpha_plane)
{
    if (alpha_plane) return b / 2;
    if (format == FORMAT_YUY2 || format == FORMAT_W210) {
        const int sample = format == FORMAT_W210 ? b / 2 : b;
        return (sample / 4) * 2 + (sample % 4 == 2);
    }
    return b / 4;
}

// Compares a destination plane with its copy from before the call; returns a
// description of the first byte that the call should not have changed, and
// counts the bytes it changed.
std::string check_plane(const char* name, const Plane& p, const std::vector<uint8_t>& before, int format,
                        bool alpha_plane, const Writable& w, size_t& changed)
{
    const uint8_t* now = p.block->data();
    for (int y = 0; y < p.height; ++y) {
        const size_t off = p.line_offset(y);
        const bool line_ok = w.line(y);
        for (int b = 0; b < p.line_bytes; ++b) {
            if (now[off + size_t(b)] == before[off + size_t(b)]) continue;
            ++changed;
            const int x = owner(format, b, alpha_plane);
            if (line_ok && x >= w.x_begin && x < w.x_end) continue;
            std::ostringstream o;
            o << name << " plane: byte " << b << " of line " << y << " (pixel " << x << ") changed from "
              << int(before[off + size_t(b)]) << " to " << int(now[off + size_t(b)])
              << "; writable: pixels [" << w.x_begin << ", " << w.x_end << ") of "
              << (w.field < 0 ? "lines [" : w.field ? "odd field lines [" : "even field lines [") << w.j_begin
              << ", " << w.j_end << ") congruent to " << w.residue << " mod " << w.period
              << (w.any ? "" : " (none: the call must draw nothing)");
            return o.str();
        }
    }
    return {};
}

// ---------------------------------------------------------------------------
// Faults

// A fault (or a sanitizer's abort) kills the process before any assertion
// can speak, so the case in flight is kept ready for the signal handler to
// print before the previous handler (the default, or a sanitizer's report)
// takes over.
char g_in_flight[4096];
size_t g_in_flight_length = 0;
constexpr int kSignals[] = {SIGSEGV, SIGBUS, SIGABRT};
struct sigaction g_previous[3];

const struct sigaction& previous_of(int sig)
{
    for (int i = 0; i < 3; ++i)
        if (kSignals[i] == sig) return g_previous[i];
    return g_previous[0];
}

void on_fault(int sig, siginfo_t* info, void* context)
{
    static const char head[] = "\nlorvex stress: fault during ";
    ssize_t ignored = write(STDERR_FILENO, head, sizeof head - 1);
    ignored = write(STDERR_FILENO, g_in_flight, g_in_flight_length);
    (void)ignored;
    const struct sigaction& prev = previous_of(sig);
    if (prev.sa_flags & SA_SIGINFO) {
        if (prev.sa_sigaction) prev.sa_sigaction(sig, info, context);
        return;
    }
    if (prev.sa_handler != SIG_DFL && prev.sa_handler != SIG_IGN) {
        prev.sa_handler(sig);
        return;
    }
    signal(sig, SIG_DFL);
    if (sig == SIGABRT) raise(sig);
    // A fault returns and re-runs the faulting access, which now ends the process.
}

class FaultReporter {
public:
    FaultReporter()
    {
        struct sigaction sa {};
        sa.sa_sigaction = on_fault;
        sa.sa_flags = SA_SIGINFO | SA_NODEFER;
        sigemptyset(&sa.sa_mask);
        for (int i = 0; i < 3; ++i) sigaction(kSignals[i], &sa, &g_previous[i]);
    }
    ~FaultReporter()
    {
        for (int i = 0; i < 3; ++i) sigaction(kSignals[i], &g_previous[i], nullptr);
    }
    static void set(const std::string& text)
    {
        g_in_flight_length = std::min(text.size(), sizeof g_in_flight);
        std::memcpy(g_in_flight, text.data(), g_in_flight_length);
    }
};

// ---------------------------------------------------------------------------
// Running a case

struct Result {
    std::string failure;  // empty when the call kept to what it may touch
    size_t changed = 0;   // destination bytes the call changed
};

Result run_case(const Case& c)
{
    Rng fill{c.fill};
    Planes dst, src;
    make_planes(c.dst, false, c.guard_before, fill, dst);
    make_planes(c.src, true, c.guard_before, fill, src);

    std::vector<uint8_t> colour_before, alpha_before;
    if (dst.colour) colour_before.assign(dst.colour.block->data(), dst.colour.block->data() + dst.colour.block->size());
    if (dst.alpha) alpha_before.assign(dst.alpha.block->data(), dst.alpha.block->data() + dst.alpha.block->size());

    map_rectangle(&dst.surface, c.x0, c.y0, c.x1, c.y1, &src.surface, c.sx0, c.sy0, c.sx1, c.sy1,
                  int32_t(c.flags), c.line_phase, c.line_period);

    Result r;
    const Writable w = writable(c);
    if (dst.colour) r.failure = check_plane("colour", dst.colour, colour_before, c.dst.format, false, w, r.changed);
    if (r.failure.empty() && dst.alpha)
        r.failure = check_plane("alpha", dst.alpha, alpha_before, c.dst.format, true, w, r.changed);
    return r;
}

std::string describe(int index, const Case& c)
{
    std::ostringstream o;
    o << "case " << index << " of seed 0x" << std::hex << kSeed << std::dec
      << " (re-run: lorvex_tests --gtest_filter=Stress.Replay -- " << index << ")\n"
      << case_literal(c) << "\n";
    return o.str();
}

// What the generator covered, so that a change to it cannot quietly stop
// exercising a pairing, a filter or a kind of call.
struct Coverage {
    std::array<int, kPairings> pairings{};
    std::array<int, 8> hfilter{}, vfilter{};
    int refused = 0, odd_source = 0, odd_dest = 0, bottom_up = 0, guard_before = 0;
    int source_field = 0, dest_field = 0, tile = 0, gain = 0, phased = 0;
    int drew = 0, drawable = 0;

    static int pairing_index(const Case& c)
    {
        if (!pairing_accepted(c.dst, c.src)) return -1;
        const int sa = c.src.alpha_format ? (c.src.alpha_mode == ALPHA_MODE_STRAIGHT ? 1 : 2) : 0;
        const int da = c.dst.alpha_format ? 1 : 0;
        if (is_422(c.src.format))
            return (c.src.format == FORMAT_W210) + 2 * (c.dst.format == FORMAT_W210) + 4 * sa + 12 * da;
        if (c.src.format == FORMAT_RGBQ) return 24 + sa + 3 * da;
        return 30;
    }

    void add(const Case& c, const Result& r)
    {
        const int p = pairing_index(c);
        if (p < 0) ++refused;
        else ++pairings[size_t(p)];
        ++hfilter[(c.flags >> 8) & 7];
        ++vfilter[(c.flags >> 11) & 7];
        odd_source += is_422(c.src.format) && (c.src.width & 1);
        odd_dest += is_422(c.dst.format) && (c.dst.width & 1);
        bottom_up += c.src.bottom_up + c.dst.bottom_up;
        guard_before += c.guard_before;
        source_field += (c.flags & 0xC) != 0;
        dest_field += (c.flags & 0xC0) != 0;
        tile += (c.flags & LORVEX_TILE) != 0;
        gain += (((int32_t(c.flags) >> 16) - 4096) & 0x1FFC) > 4096;
        phased += c.line_period > 1;
        if (writable(c).any) {
            ++drawable;
            drew += r.changed != 0;
        }
    }
};

// The case to re-run: the number after "--" on the command line, or the one
// compiled in.
bool replay_index(int& index)
{
    const std::vector<std::string> args = testing::internal::GetArgvs();
    for (size_t i = 0; i + 1 < args.size(); ++i)
        if (args[i] == "--") {
            index = std::atoi(args[i + 1].c_str());
            return true;
        }
#ifdef LORVEX_STRESS_CASE
    index = LORVEX_STRESS_CASE;
    return true;
#else
    return false;
#endif
}

TEST(Stress, RandomLegalCallsTouchOnlyWhatTheyMay)
{
    FaultReporter reporter;
    Coverage cov;
    int failures = 0;
    for (int i = 0; i < kCases; ++i) {
        const Case c = make_case(i);
        const std::string text = describe(i, c);
        FaultReporter::set(text);
        const Result r = run_case(c);
        cov.add(c, r);
        if (!r.failure.empty()) {
            ADD_FAILURE() << r.failure << "\n" << text;
            if (++failures == 10) break;
        }
    }
    if (failures) return;

    for (int p = 0; p < kPairings; ++p) EXPECT_GT(cov.pairings[size_t(p)], 200) << "pairing " << p;
    for (int k = 0; k < 8; ++k) {
        EXPECT_GT(cov.hfilter[size_t(k)], 1000) << "horizontal kind " << k;
        EXPECT_GT(cov.vfilter[size_t(k)], 1000) << "vertical kind " << k;
    }
    EXPECT_GT(cov.refused, 300);
    EXPECT_GT(cov.odd_source, 3000);
    EXPECT_GT(cov.odd_dest, 3000);
    EXPECT_GT(cov.bottom_up, 3000);
    EXPECT_GT(cov.guard_before, 5000);
    EXPECT_GT(cov.source_field, 3000);
    EXPECT_GT(cov.dest_field, 3000);
    EXPECT_GT(cov.tile, 3000);
    EXPECT_GT(cov.gain, 1000);
    EXPECT_GT(cov.phased, 3000);
    // Most calls that may draw do draw: a library that refused everything
    // would pass every check above.
    EXPECT_GT(cov.drew, cov.drawable * 3 / 4) << cov.drew << " of " << cov.drawable << " drew";
}

// The destination planes after one call of a case, colour then alpha.
std::vector<uint8_t> draw_case(const Case& c)
{
    Rng fill{c.fill};
    Planes dst, src;
    make_planes(c.dst, false, c.guard_before, fill, dst);
    make_planes(c.src, true, c.guard_before, fill, src);
    map_rectangle(&dst.surface, c.x0, c.y0, c.x1, c.y1, &src.surface, c.sx0, c.sy0, c.sx1, c.sy1,
                  int32_t(c.flags), c.line_phase, c.line_period);
    std::vector<uint8_t> out;
    if (dst.colour) out.insert(out.end(), dst.colour.block->data(), dst.colour.block->data() + dst.colour.block->size());
    if (dst.alpha) out.insert(out.end(), dst.alpha.block->data(), dst.alpha.block->data() + dst.alpha.block->size());
    return out;
}

// Whole calls at every vector level the processor has draw the bytes of the
// scalar kernels, over the same random legal calls.
TEST(Stress, VectorLevelsDrawTheScalarBytes)
{
    using lorvex::detected_simd_level, lorvex::force_simd_level, lorvex::SimdLevel;
    std::vector<SimdLevel> levels;
    for (SimdLevel l : {SimdLevel::sse41, SimdLevel::avx2})
        if (int(l) <= int(detected_simd_level())) levels.push_back(l);
    if (levels.empty()) GTEST_SKIP() << "no vector level on this processor";
    FaultReporter reporter;
    int failures = 0;
    for (int i = 0; i < 2500 && failures < 5; ++i) {
        const Case c = make_case(i);
        const std::string text = describe(i, c);
        FaultReporter::set(text);
        force_simd_level(SimdLevel::scalar);
        const std::vector<uint8_t> scalar = draw_case(c);
        for (SimdLevel level : levels) {
            force_simd_level(level);
            if (draw_case(c) != scalar) {
                ADD_FAILURE() << "level " << int(level) << " differs from the scalar kernels\n" << text;
                ++failures;
            }
        }
    }
    force_simd_level(detected_simd_level());
}

TEST(Stress, Regressions)
{
    FaultReporter reporter;
    for (size_t i = 0; i < kRegressions.size(); ++i) {
        const Case& c = kRegressions[i];
        FaultReporter::set("regression " + std::to_string(i) + "\n" + case_literal(c) + "\n");
        const Result r = run_case(c);
        EXPECT_TRUE(r.failure.empty()) << r.failure << "\nregression " << i << "\n" << case_literal(c);
    }
}

TEST(Stress, Replay)
{
    int index = 0;
    if (!replay_index(index)) GTEST_SKIP() << "no case given (lorvex_tests --gtest_filter=Stress.Replay -- N)";
    FaultReporter reporter;
    const Case c = make_case(index);
    const std::string text = describe(index, c);
    std::printf("%s", text.c_str());
    FaultReporter::set(text);
    const Result r = run_case(c);
    EXPECT_TRUE(r.failure.empty()) << r.failure << "\n" << text;
    std::printf("%zu destination bytes changed\n", r.changed);
}

}  // namespace
