// The records that the two stages of the rectangle pipeline share: the work
// record MapContext that drivers fill and kernels read, the StripRecord of
// one strip, the line buffer, and the shape of the kernel tables.
//
// Line buffer units (13 bits for colour): an 8-bit sample is stored x 32, a
// 10-bit sample x 8, an alpha word (4096 = 1.0) x 4 so that 16384 = 1.0.
// Black is 512 and neutral chroma 4096 at either depth. Colour of pixel i
// stands at element i * S (S samples per pixel of the source); alpha, when
// present, at line_a[i].
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "shared/formats.h"

namespace lorvex {

// One strip: a run of destination pixels whose source pixels fit the line
// buffer at once, with the constant regions beyond the source's ends.
struct StripRecord {
    int32_t src_first;          // first source pixel, even, >= 0
    int32_t src_end;            // one past the last source pixel, <= width
    int32_t pad_left;           // buffer index of src_first; even
    int32_t last;               // buffer index of the last valid pixel
    int32_t pad_right;          // pixels to fill right of `last`
    int32_t left_x16;           // left region start, 16.16 destination pixels
    int32_t left_first_cover;   // coverage of its first pixel, 16.16
    int32_t left_x;             // its first destination pixel
    int32_t left_width16;       // its width, 16.16; 0: no left region
    int32_t right_x16;
    int32_t right_first_cover;
    int32_t right_x;
    int32_t right_width16;      // 0: no right region
    int32_t phase;              // filter path: first position in 16.16 source
                                // pixels of the buffer; area path: destination units
    int32_t x16;                // main region start, 16.16
    int32_t first_cover;        // coverage of its first pixel, 16.16
    int32_t x;                  // its first destination pixel
    int32_t width16;            // its width, 16.16; 0: no main region
};
static_assert(sizeof(StripRecord) == 18 * 4);

constexpr int kMaxStrips = 16;

// Source line pointers are indexed from -7 to 8 around the current line.
struct LineSet {
    std::array<const uint8_t*, 16> ptr{};
    const uint8_t*& operator[](int k) { return ptr[size_t(k + 7)]; }
    const uint8_t* operator[](int k) const { return ptr[size_t(k + 7)]; }
};

struct MapContext {
    uint8_t* dst_line = nullptr;   // current destination line, colour plane
    uint8_t* dst_line2 = nullptr;  // current destination line, second plane (u16)
    int32_t hstep = 0;             // filter path: source px per dest px, 16.16;
                                   // area path: dest units per source px (>= 128)
    int32_t vcover = 0;            // vertical coverage of this line, 1..16384
    uint8_t clamp = 0;             // limit every sample leaving the buffer
    uint8_t tile = 0;              // 0 overlay, 1 tile
    uint8_t src_assoc = 0;         // source alpha_mode (drivers only)
    uint8_t dst_assoc = 0;         // destination alpha_mode: 2 premultiplied
    int16_t* line = nullptr;       // colour section of the line buffer
    int16_t* line_a = nullptr;     // alpha section of the line buffer
    int32_t src_line = 0;          // current (upper) source line
    int32_t vphase = 0;            // 0..15 for banks, 16-bit fraction for linear
    int32_t src_stride = 0;        // bytes between source lines, colour plane
    LineSet lines;                 // colour-plane lines of the tap set
    const int16_t* hbank_y = nullptr;  // bank row: luma, alpha, 4-sample layouts
    const int16_t* hbank_c = nullptr;  // bank row: chroma of 4:2:2 sources
    const int16_t* vbank = nullptr;    // vertical bank row
    int32_t src_stride2 = 0;       // bytes between source lines, second plane
    LineSet lines2;                // second-plane lines of the tap set
    int32_t level = 4096;          // opacity, 4096 = 1.0, never 0
    int32_t box_step = 0;          // area vertical: weight of a middle line
    int32_t box_first = 0;         // weight of the first line
    int32_t box_mid = 0;           // number of middle lines
    int32_t box_last = 0;          // weight of the last line
};

using Kernel = void (*)(const MapContext&, const StripRecord&);

// Vertical table, 24 slots:
//   0 pad left, 1 pad right, 2 and 3 one line (same function), 4 box,
//   5 linear with a 16-bit fraction, 6 two bank taps, 7..13 2T bank taps by
//   stride (T = slot - 5), 14 two taps through the pointer array, 15..21 2T
//   taps through the pointer array (T = slot - 13), 22 the edge-adaptive
//   kind 7 (YUY2 and RGBQ only), 23 null.
constexpr int kVerticalSlots = 24;
using VerticalKernelTable = std::array<Kernel, kVerticalSlots>;

// Horizontal table, 14 slots:
//   0 left constant region, 1 right constant region, 2 area, 3 linear with a
//   16-bit fraction, 4..11 bank with 2(T + 1) taps (T = slot - 4), 12 the
//   main kernel of kind 7 (draws nothing; null in H_W210), 13 null.
constexpr int kHorizontalSlots = 14;
using HorizontalKernelTable = std::array<Kernel, kHorizontalSlots>;

namespace vslot {
constexpr int pad_left = 0, pad_right = 1, line_above = 2, line_below = 3, box = 4, linear = 5,
              two_taps = 6, stride_taps = 5 /* + T */, pointer_taps = 13 /* + T */, edge = 22;
}
namespace hslot {
constexpr int left = 0, right = 1, area = 2, linear = 3, bank = 4 /* + T */, edge = 12;
}

// The line buffer. A few elements before `line` are part of the storage, so
// that the right region of a one-pair strip of an odd-width source, which
// reads the chroma element before the pair, reads defined memory; a few after
// its end let the vector tap kernels load whole registers around a window
// whose last elements they weigh by zero.
struct alignas(64) LineBuffer {
    static constexpr int kLead = 32;
    static constexpr int kTail = 64;
    int16_t storage[kLead + kLineBufferElements + kTail];
    int16_t* line() { return storage + kLead; }
};

// Source and destination pixel addresses.
template <class T>
inline T* pixel_ptr(uint8_t* base, int32_t stride, int32_t line)
{
    return reinterpret_cast<T*>(base + ptrdiff_t(stride) * line);
}

}  // namespace lorvex
