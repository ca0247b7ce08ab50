// How the horizontal tables are put together from the walk, the samplers
// and the families; shared by the scalar tables and their vector twins, which
// differ only in the bank sampler they use.
#pragma once

#include "horizontal/compose_alpha.h"
#include "horizontal/compose_da.h"
#include "horizontal/compose_plain.h"
#include "horizontal/compose_sa.h"
#include "horizontal/compose_sa_da.h"
#include "horizontal/sample_area.h"
#include "horizontal/sample_taps.h"
#include "horizontal/walk.h"
#include "shared/isa.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

template <class Units, int T>
using ScalarBank = BankSampler<Units, T>;
template <class Units>
using ScalarArea = AreaSampler<Units>;
template <class Units>
using ScalarLinear = LinearSampler<Units>;

// The kernels of one table. Samples in stored depth; alpha in the unit the
// family reads (AlphaShift: 0 for 1/16384, 2 for 1/4096, kNoAlpha).
template <class Dst, class Family, int AlphaShift, class BankFamily = Family,
          template <class, int> class Bank = ScalarBank, template <class> class Area = ScalarArea,
          template <class> class Linear = ScalarLinear>
struct Kernels {
    using Units = StoredSpec<Dst, AlphaShift>;
    // The area walk of RGBQ runs in steps of two pixels, like the pairs.
    static constexpr bool kAreaPairs = !Dst::alpha_only;

    static constexpr Kernel left = region_C<Dst, Family, false>;
    static constexpr Kernel right = region_C<Dst, Family, true>;
    static constexpr Kernel area = main_kernel_C<Dst, Area<Units>, Family, kAreaPairs>;
    static constexpr Kernel linear = main_kernel_C<Dst, Linear<Units>, Family, Dst::pairs>;
    template <int T>
    static constexpr Kernel bank = main_kernel_C<Dst, Bank<Units, T>, BankFamily, Dst::pairs>;
};

// The source-alpha tables: slots 2 to 5 choose per call between the fast form
// (colour in buffer units, alpha in 1/16384) and the general form.
template <class Dst, template <class, int> class Bank = ScalarBank, template <class> class Linear = ScalarLinear>
struct SourceAlphaKernels : Kernels<Dst, SourceAlphaFamily, 0, SourceAlphaFamily, Bank> {
    using Base = Kernels<Dst, SourceAlphaFamily, 0, SourceAlphaFamily, Bank>;
    using Units = typename Base::Units;
    using FastArea = SampleSpec<Dst, 0, 0, true>;
    using Fast = SampleSpec<Dst, 0, 0>;

    static constexpr Kernel area = fast_or_general_C<Dst, AreaSampler<Units>, AreaSampler<FastArea>,
                                                     SourceAlphaFamily, SourceAlphaFastFamily, true>;
    static constexpr Kernel linear = fast_or_general_C<Dst, Linear<Units>, Linear<Fast>,
                                                       SourceAlphaFamily, SourceAlphaFastFamily, Dst::pairs>;
    template <int T>
    static constexpr Kernel bank =
        T <= 1 ? fast_or_general_C<Dst, Bank<Units, T>, Bank<Fast, T>, SourceAlphaFamily, SourceAlphaFastFamily,
                                   Dst::pairs>
               : Base::template bank<T>;
};

// Kind 7's empty main kernel stands in slot 12 where `HasEdge`.
template <class K, bool HasEdge = true>
constexpr HorizontalKernelTable make_table()
{
    return {
        K::left,        K::right,       K::area,        K::linear,      K::template bank<0>,
        K::template bank<1>, K::template bank<2>, K::template bank<3>, K::template bank<4>,
        K::template bank<5>, K::template bank<6>, K::template bank<7>, HasEdge ? empty_C : nullptr,
        nullptr,
    };
}

// The thirteen tables of one instruction set, in their order of storage.
template <template <class, int> class Bank, template <class> class Area = ScalarArea,
          template <class> class Linear = ScalarLinear>
struct TableSet {
    static constexpr std::array<HorizontalKernelTable, kHorizontalTables> tables = {
        make_table<Kernels<DstYuy2, PlainFamily, kNoAlpha, PlainFamily, Bank, Area, Linear>>(),
        make_table<Kernels<DstYuy2, DestAlphaFamily, kNoAlpha, DestAlphaFamily, Bank>>(),
        make_table<SourceAlphaKernels<DstYuy2, Bank, Linear>>(),
        make_table<Kernels<DstYuy2, SourceDestAlphaFamily, 2, SourceDestAlphaFamily, Bank>>(),
        make_table<Kernels<DstW210, PlainFamily, kNoAlpha, PlainFamily, Bank, Area, Linear>, false>(),
        make_table<Kernels<DstW210, DestAlphaFamily, kNoAlpha, DestAlphaFamily, Bank>>(),
        make_table<SourceAlphaKernels<DstW210, Bank, Linear>>(),
        make_table<Kernels<DstW210, SourceDestAlphaFamily, 2, SourceDestAlphaFamily, Bank>>(),
        make_table<Kernels<DstRgbq, PlainFamily, kNoAlpha, PlainFamily, Bank, Area, Linear>>(),
        make_table<Kernels<DstRgbq, DestAlphaFamily, kNoAlpha, DestAlphaFamily, Bank>>(),
        make_table<SourceAlphaKernels<DstRgbq, Bank, Linear>>(),
        make_table<Kernels<DstRgbq, SourceDestAlphaFamily, 2, SourceDestAlphaFamily, Bank>>(),
        make_table<Kernels<DstAlpha, AlphaOnlyFamily, 2, AlphaOnlyBankFamily, Bank>>(),
    };
};

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
