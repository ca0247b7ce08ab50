// The vertical kernel tables: one per source layout and alpha treatment, slot
// order as in map_context.h.
#include <utility>

#include "vertical/vertical_kernels.h"

namespace lorvex {
namespace vertical {
namespace {

template <class Src, Kernel Edge>
constexpr VerticalKernelTable make_table()
{
    return {
        pad_left_C<Src>,         pad_right_C<Src>,        one_line_C<Src>,         one_line_C<Src>,
        box_C<Src>,              linear_C<Src>,           bank_C<Src, 1, false>,   bank_C<Src, 2, false>,
        bank_C<Src, 3, false>,   bank_C<Src, 4, false>,   bank_C<Src, 5, false>,   bank_C<Src, 6, false>,
        bank_C<Src, 7, false>,   bank_C<Src, 8, false>,   bank_C<Src, 1, true>,    bank_C<Src, 2, true>,
        bank_C<Src, 3, true>,    bank_C<Src, 4, true>,    bank_C<Src, 5, true>,    bank_C<Src, 6, true>,
        bank_C<Src, 7, true>,    bank_C<Src, 8, true>,    Edge,                    nullptr,
    };
}

}  // namespace
}  // namespace vertical

constexpr VerticalKernelTable V_YUY2 = vertical::make_table<SrcYuy2, vertical::edge7_yuy2_C>();
constexpr VerticalKernelTable V_W210 = vertical::make_table<SrcW210, nullptr>();
constexpr VerticalKernelTable V_RGBQ = vertical::make_table<SrcRgbq, vertical::edge7_rgbq_C>();
constexpr VerticalKernelTable V_ALPHA = vertical::make_table<SrcAlpha, nullptr>();

}  // namespace lorvex
