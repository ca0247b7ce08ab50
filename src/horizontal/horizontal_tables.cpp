// The horizontal kernel tables: one per destination layout and composition
// family, slot order as in map_context.h.
#include "horizontal/horizontal_kernels.h"

#include "horizontal/compose_plain.h"
#include "horizontal/sample_area.h"
#include "horizontal/sample_taps.h"
#include "horizontal/walk.h"

namespace lorvex {
namespace horizontal {
namespace {

template <class Dst, class Family, int T>
constexpr Kernel bank()
{
    return main_kernel_C<Dst, BankSampler<Dst, T>, Family, Dst::pairs>;
}

// Kind 7's empty main kernel stands in slot 12 where `HasEdge`.
template <class Dst, class Family, bool HasEdge>
constexpr HorizontalKernelTable make_table()
{
    return {
        region_C<Dst, Family, false>,
        region_C<Dst, Family, true>,
        main_kernel_C<Dst, AreaSampler<Dst>, Family, true>,
        main_kernel_C<Dst, LinearSampler<Dst>, Family, Dst::pairs>,
        bank<Dst, Family, 0>(),
        bank<Dst, Family, 1>(),
        bank<Dst, Family, 2>(),
        bank<Dst, Family, 3>(),
        bank<Dst, Family, 4>(),
        bank<Dst, Family, 5>(),
        bank<Dst, Family, 6>(),
        bank<Dst, Family, 7>(),
        HasEdge ? empty_C : nullptr,
        nullptr,
    };
}

}  // namespace
}  // namespace horizontal

constexpr HorizontalKernelTable H_YUY2 = horizontal::make_table<DstYuy2, horizontal::PlainFamily, true>();
constexpr HorizontalKernelTable H_W210 = horizontal::make_table<DstW210, horizontal::PlainFamily, false>();
constexpr HorizontalKernelTable H_RGBQ = horizontal::make_table<DstRgbq, horizontal::PlainFamily, true>();

}  // namespace lorvex
