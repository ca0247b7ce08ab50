// The vertical kernel tables: one per source layout and alpha treatment, slot
// order as in map_context.h.
#include <utility>

#include "shared/simd.h"
#include "vertical/straight_kernels.h"
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

template <class Src>
constexpr VerticalKernelTable make_straight_table()
{
    return {
        straight_pad_left_C<Src>,          straight_pad_right_C<Src>,         straight_one_line_C<Src>,
        straight_one_line_C<Src>,          straight_box_C<Src>,               straight_linear_C<Src>,
        straight_bank_C<Src, 1, false>,    straight_bank_C<Src, 2, false>,    straight_bank_C<Src, 3, false>,
        straight_bank_C<Src, 4, false>,    straight_bank_C<Src, 5, false>,    straight_bank_C<Src, 6, false>,
        straight_bank_C<Src, 7, false>,    straight_bank_C<Src, 8, false>,    straight_bank_C<Src, 1, true>,
        straight_bank_C<Src, 2, true>,     straight_bank_C<Src, 3, true>,     straight_bank_C<Src, 4, true>,
        straight_bank_C<Src, 5, true>,     straight_bank_C<Src, 6, true>,     straight_bank_C<Src, 7, true>,
        straight_bank_C<Src, 8, true>,     nullptr,                           nullptr,
    };
}

}  // namespace
}  // namespace vertical

constexpr VerticalKernelTable V_YUY2 = vertical::make_table<SrcYuy2, vertical::edge7_yuy2_C>();
constexpr VerticalKernelTable V_W210 = vertical::make_table<SrcW210, nullptr>();
constexpr VerticalKernelTable V_RGBQ = vertical::make_table<SrcRgbq, vertical::edge7_rgbq_C>();
constexpr VerticalKernelTable V_ALPHA = vertical::make_table<SrcAlpha, nullptr>();
constexpr VerticalKernelTable V_YUY2_STRAIGHT = vertical::make_straight_table<SrcYuy2>();
constexpr VerticalKernelTable V_W210_STRAIGHT = vertical::make_straight_table<SrcW210>();
constexpr VerticalKernelTable V_RGBQ_STRAIGHT = vertical::make_straight_table<SrcRgbq>();

}  // namespace lorvex

namespace lorvex {

const VerticalKernelTable* vertical_table_for(const VerticalKernelTable* table, SimdLevel level)
{
#if defined(LORVEX_HAVE_X86_KERNELS)
    static constexpr const VerticalKernelTable* scalar[kVectorVerticalTables] = {
        &V_YUY2, &V_W210, &V_RGBQ, &V_ALPHA, &V_YUY2_STRAIGHT, &V_W210_STRAIGHT, &V_RGBQ_STRAIGHT,
    };
    if (level != SimdLevel::scalar)
        for (int i = 0; i < kVectorVerticalTables; ++i)
            if (scalar[i] == table)
                return level == SimdLevel::avx2 ? &vertical_tables_isa_avx2[size_t(i)]
                                                : &vertical_tables_isa_sse41[size_t(i)];
#else
    (void)level;
#endif
    return table;
}

}  // namespace lorvex
