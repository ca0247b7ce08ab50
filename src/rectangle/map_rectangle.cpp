// map_rectangle: entry of the call. Decodes the flags, pairs the formats with
// their kernel tables, selects fields, clips, then hands over to the plan and
// the line walk. A call that cannot be served returns before anything is
// written.
//
// What the host must not pass is refused rather than trusted, where refusing
// costs nothing: a line_period of 0 or below draws nothing; a span that would
// need more than 16 strips draws nothing; a filter kind whose kernel the
// pairing's table lacks (horizontal kind 7 into W210 without alpha, vertical
// kind 7 from a source other than YUY2 or RGBQ without alpha plane) draws
// nothing; so does a source without pixels (a one-line source read as a
// field has none). Vertical kind 7 has no alpha pass, so a premultiplied source with an
// alpha plane is refused with it rather than drawn from an unfilled alpha
// section.
#include <cmath>
#include <limits>

#include "horizontal/horizontal_kernels.h"
#include "lorvex.h"
#include "rectangle/rectangle.h"
#include "shared/simd.h"
#include "vertical/straight_kernels.h"
#include "vertical/vertical_kernels.h"

namespace lorvex::rectangle {

int32_t trunc_i32(double v)
{
    if (!(v > -2147483649.0 && v < 2147483648.0)) return std::numeric_limits<int32_t>::min();
    return int32_t(v);
}

int64_t trunc_i64(double v)
{
    if (!(v > -9223372036854775808.0 && v < 9223372036854775808.0))
        return std::numeric_limits<int64_t>::min();
    return int64_t(v);
}

namespace {

// A single-precision product truncated toward zero.
int32_t trunc_f32(float v)
{
    return trunc_i32(double(v));
}

// Chooses the tables for the pairing of the two images; false to refuse.
// Sources of the two 4:2:2 formats pair freely with destinations of the two;
// RGBQ and ALPHA pair only with themselves. The vertical table depends on the
// source alone; the horizontal table on the destination's layout and on which
// side has alpha, since the line buffer holds every source in one unit.
bool pair_formats(Call& k, const Surface& dst, const Surface& src)
{
    if ((src.alpha_format != ALPHA_NONE && src.alpha_format != ALPHA_W12B) ||
        (dst.alpha_format != ALPHA_NONE && dst.alpha_format != ALPHA_W12B))
        return false;
    const bool sa = src.alpha_format == ALPHA_W12B;
    const bool da = dst.alpha_format == ALPHA_W12B;
    // A source counts as straight only at 1.
    const bool straight = sa && src.alpha_mode == ALPHA_MODE_STRAIGHT;
    k.has_alpha = sa ? 1 : 0;

    // Premultiplied alpha is filtered in a pass of its own, which can
    // overshoot: every sample leaving the buffer is then limited.
    const auto colour = [&](const VerticalKernelTable& plain, const VerticalKernelTable& straight_table) {
        k.vtable = straight ? &straight_table : &plain;
        if (sa && !straight) {
            k.alpha_vtable = &V_ALPHA;
            k.ctx.clamp = 1;
        }
    };
    const auto horizontal = [&](const HorizontalKernelTable& plain, const HorizontalKernelTable& dest_alpha,
                                const HorizontalKernelTable& src_alpha, const HorizontalKernelTable& both) {
        k.htable = sa ? (da ? &both : &src_alpha) : (da ? &dest_alpha : &plain);
    };

    if (src.format == FORMAT_YUY2 || src.format == FORMAT_W210) {
        if (dst.format == FORMAT_YUY2)
            horizontal(H_YUY2, H_YUY2_DA, H_YUY2_SA, H_YUY2_SA_DA);
        else if (dst.format == FORMAT_W210)
            horizontal(H_W210, H_W210_DA, H_W210_SA, H_W210_SA_DA);
        else
            return false;
        if (src.format == FORMAT_YUY2)
            colour(V_YUY2, V_YUY2_STRAIGHT);
        else
            colour(V_W210, V_W210_STRAIGHT);
        k.pixel_words = 2;
        k.chroma_factor = 1;
        k.chroma_spacing = 2;
        // A 10-bit sample of 1023 is 8184 units and would round to 256 in 8 bits.
        if (src.format == FORMAT_W210 && dst.format == FORMAT_YUY2) k.ctx.clamp = 1;
        return true;
    }
    if (src.format == FORMAT_RGBQ && dst.format == FORMAT_RGBQ) {
        colour(V_RGBQ, V_RGBQ_STRAIGHT);
        horizontal(H_RGBQ, H_RGBQ_DA, H_RGBQ_SA, H_RGBQ_SA_DA);
        k.pixel_words = 4;
        k.chroma_factor = 0;
        k.chroma_spacing = 1;
        return true;
    }
    if (src.format == FORMAT_ALPHA && dst.format == FORMAT_ALPHA && sa && da) {
        k.vtable = &V_ALPHA;
        k.htable = &H_ALPHA;
        k.pixel_words = 0;
        k.chroma_factor = 0;
        k.chroma_spacing = 1;
        return true;
    }
    return false;
}

}  // namespace
}  // namespace lorvex::rectangle

extern "C" LORVEX_API void map_rectangle(const Surface* dest, float x0, float y0, float x1, float y1,
                                         const Surface* source, float sx0f, float sy0f, float sx1f,
                                         float sy1f, int32_t flags, int32_t line_phase,
                                         int32_t line_period)
{
    using namespace lorvex;
    using namespace lorvex::rectangle;

    Call k;
    k.flags = decode_flags(flags);
    k.ctx.level = k.flags.level;
    if (k.ctx.level == 0) return;
    if (line_period <= 0) return;
    if (!pair_formats(k, *dest, *source)) return;
    // The vector level, once for the whole call.
    const SimdLevel simd = simd_level();
    k.vtable = vertical_table_for(k.vtable, simd);
    if (k.alpha_vtable) k.alpha_vtable = vertical_table_for(k.alpha_vtable, simd);
    k.htable = horizontal_table_for(k.htable, simd);

    LineBuffer buffer;  // on the stack, as all state of the call
    // The lead-in before the buffer is read only by the right region of a
    // one-pair strip of an odd-width source; it holds neutral chroma.
    for (int i = 0; i < LineBuffer::kLead; ++i) buffer.storage[i] = 4096;

    k.ctx.tile = k.flags.tile ? 1 : 0;
    k.ctx.src_assoc = source->alpha_mode;
    k.ctx.dst_assoc = dest->alpha_mode;
    k.ctx.line = buffer.line();
    k.ctx.line_a = buffer.line();
    k.chroma_soften = source->format == FORMAT_RGBQ ? 0 : k.flags.chroma_soften;
    k.line_phase = line_phase;
    k.line_period = line_period;

    k.src_data = static_cast<const uint8_t*>(source->data);
    k.src_stride = source->stride;
    k.src_alpha = static_cast<const uint8_t*>(source->alpha_data);
    k.src_alpha_stride = source->alpha_stride;
    k.src_width = source->width;
    k.src_height = source->height;
    k.dst_data = static_cast<uint8_t*>(dest->data);
    k.dst_stride = dest->stride;
    k.dst_alpha = static_cast<uint8_t*>(dest->alpha_data);
    k.dst_alpha_stride = dest->alpha_stride;
    k.dst_width = dest->width;
    k.dst_height = dest->height;

    double sx0 = sx0f, sy0 = sy0f, sx1 = sx1f, sy1 = sy1f;

    // Destination field: halve the rectangle, write every other line, and move
    // the source by a quarter of a field line's step so that the field's lines
    // sample where they stand in the frame.
    if (k.flags.dest_even_field || k.flags.dest_odd_field) {
        y0 *= 0.5f;
        y1 *= 0.5f;
        double d;
        if (k.flags.dest_even_field) {
            d = -0.25;
            k.dst_height = (dest->height + 1) >> 1;
        } else {
            d = 0.25;
            k.dst_height = dest->height >> 1;
            if (k.dst_data) k.dst_data += k.dst_stride;
            if (k.dst_alpha) k.dst_alpha += k.dst_alpha_stride;
        }
        k.dst_stride *= 2;
        k.dst_alpha_stride *= 2;
        const double off = (sy1 - sy0) * d / double(y1 - y0);
        sy0 += off;
        sy1 += off;
    }

    // Source field: read every other line, at half the line positions.
    if (k.flags.source_even_field || k.flags.source_odd_field) {
        if (k.flags.source_even_field) {
            sy0 = sy0 * 0.5 + 0.25;
            sy1 = sy1 * 0.5 + 0.25;
        } else {
            if (k.src_data) k.src_data += k.src_stride;
            if (k.src_alpha) k.src_alpha += k.src_alpha_stride;
            sy0 = sy0 * 0.5 - 0.25;
            sy1 = sy1 * 0.5 - 0.25;
        }
        k.src_stride *= 2;
        k.src_alpha_stride *= 2;
        k.src_height = source->height / 2;
    }
    // A source (or source field) without pixels has nothing to continue by.
    if (k.src_width < 1 || k.src_height < 1) return;

    // Horizontal clip. The mapping is kept: a rectangle cut at the left moves
    // its source start by as many source pixels as were cut.
    k.hstep = (sx1 - sx0) / double(x1 - x0);
    if (x0 < 0) {
        sx0 += 0.0 - double(x0) * k.hstep;
        x0 = 0;
    }
    if (x1 > float(k.dst_width)) x1 = float(k.dst_width);
    k.X0 = trunc_f32(x0 * 65536.0f);
    k.X1 = trunc_f32(x1 * 65536.0f);
    k.W16 = k.X1 - k.X0;
    if (k.W16 <= 0) return;
    k.step16 = trunc_i32(k.hstep * 65536.0 + 0.5);
    k.ctx.hstep = k.step16;
    k.count = ((k.X1 + 0xFFFF) >> 16) - (k.X0 >> 16);
    k.x0 = x0;
    k.x1 = x1;
    k.sx0 = sx0;
    k.sx1 = sx1;

    Plan plan;
    if (!plan_horizontal(k, plan)) return;
    if ((*k.htable)[size_t(plan.main_slot)] == nullptr) return;

    // Vertical clip, with the field adjustments in force.
    k.vstep = (sy1 - sy0) / double(y1 - y0);
    if (y0 < 0) {
        sy0 += 0.0 - double(y0) * k.vstep;
        y0 = 0;
    }
    if (y1 > float(k.dst_height)) y1 = float(k.dst_height);
    k.Y0 = trunc_f32(y0 * 16384.0f);
    k.H16 = -k.Y0 - trunc_f32(y1 * -16384.0f);
    if (k.H16 <= 0) return;
    k.y0 = y0;
    k.y1 = y1;
    k.sy0 = sy0;
    k.sy1 = sy1;

    draw_lines(k, plan);
}
