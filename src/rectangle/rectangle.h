// The rectangle mapping driver: the state of one map_rectangle call, from its
// preparation (map_rectangle.cpp) through the horizontal plan (plan.cpp) to
// the walk over the destination lines (vertical_loop.cpp).
//
// Floating point is used only here, once per call; everything per line is
// integer. A float becomes an integer by truncation toward zero, adding 0.5
// only where rounding is wanted.
#pragma once

#include <cstdint>

#include "shared/flags.h"
#include "shared/map_context.h"

struct Surface;

namespace lorvex::rectangle {

// Truncation toward zero of a double into 32 or 64 bits. Values that do not
// fit (or NaN) give the lowest value of the type, as the processor's own
// conversion does, instead of undefined behaviour.
int32_t trunc_i32(double v);
int64_t trunc_i64(double v);

// Everything one call knows, beside its MapContext.
struct Call {
    MapContext ctx;
    OpFlags flags{};

    const VerticalKernelTable* vtable = nullptr;
    const VerticalKernelTable* alpha_vtable = nullptr;
    const HorizontalKernelTable* htable = nullptr;
    int pixel_words = 0;     // colour samples per pixel in the line buffer
    int chroma_factor = 0;   // 1 where a separate chroma filter exists
    int chroma_spacing = 1;  // source pixels between two chroma samples of a kind
    int has_alpha = 0;       // the source has a second plane
    int chroma_soften = 0;

    // Planes after field selection.
    const uint8_t* src_data = nullptr;
    const uint8_t* src_alpha = nullptr;
    int32_t src_stride = 0, src_alpha_stride = 0;
    int32_t src_width = 0, src_height = 0;
    uint8_t* dst_data = nullptr;
    uint8_t* dst_alpha = nullptr;
    int32_t dst_stride = 0, dst_alpha_stride = 0;
    int32_t dst_width = 0, dst_height = 0;  // height for clipping (of the field)

    // Geometry. Destination rectangle in single precision, source in double.
    float x0 = 0, y0 = 0, x1 = 0, y1 = 0;
    double sx0 = 0, sy0 = 0, sx1 = 0, sy1 = 0;
    double hstep = 0;   // source pixels per destination pixel
    int32_t X0 = 0, X1 = 0, W16 = 0;  // 16.16 edges and width of the span
    int32_t step16 = 0;
    int32_t count = 0;  // destination pixels touched

    double vstep = 0;   // source lines per destination line
    int32_t Y0 = 0, H16 = 0;  // first line and height in 1/16384 of a line

    int32_t line_phase = 0, line_period = 1;
};

// The horizontal plan: the strips of every line and the main kernel.
struct Plan {
    StripRecord strips[kMaxStrips];
    int count = 0;      // 0: nothing is drawn
    int main_slot = 0;  // slot of the main kernel in the horizontal table
};

// Plans the strips; false when the call must draw nothing (no strip, or a
// span that needs more strips than there is room for).
bool plan_horizontal(Call& call, Plan& plan);

// Walks the destination lines and draws them; false when the vertical filter
// asks for a kernel that the source's table does not have.
bool draw_lines(Call& call, const Plan& plan);

}  // namespace lorvex::rectangle
