// The horizontal kernel tables: one per destination layout and composition
// family, slot order as in map_context.h. Every main kernel is the one walk
// of walk.h with a sampler (area, linear, bank of 2(T + 1) taps) and a family.
#include "horizontal/horizontal_kernels.h"

#include "horizontal/table_builder.h"
#include "shared/simd.h"

namespace lorvex {

using Scalar = horizontal::TableSet<horizontal::ScalarBank>;

constexpr HorizontalKernelTable H_YUY2 = Scalar::tables[0];
constexpr HorizontalKernelTable H_YUY2_DA = Scalar::tables[1];
constexpr HorizontalKernelTable H_YUY2_SA = Scalar::tables[2];
constexpr HorizontalKernelTable H_YUY2_SA_DA = Scalar::tables[3];
constexpr HorizontalKernelTable H_W210 = Scalar::tables[4];
constexpr HorizontalKernelTable H_W210_DA = Scalar::tables[5];
constexpr HorizontalKernelTable H_W210_SA = Scalar::tables[6];
constexpr HorizontalKernelTable H_W210_SA_DA = Scalar::tables[7];
constexpr HorizontalKernelTable H_RGBQ = Scalar::tables[8];
constexpr HorizontalKernelTable H_RGBQ_DA = Scalar::tables[9];
constexpr HorizontalKernelTable H_RGBQ_SA = Scalar::tables[10];
constexpr HorizontalKernelTable H_RGBQ_SA_DA = Scalar::tables[11];
constexpr HorizontalKernelTable H_ALPHA = Scalar::tables[12];

const HorizontalKernelTable* horizontal_table_for(const HorizontalKernelTable* table, SimdLevel level)
{
#if defined(LORVEX_HAVE_X86_KERNELS)
    static constexpr const HorizontalKernelTable* scalar[kHorizontalTables] = {
        &H_YUY2, &H_YUY2_DA, &H_YUY2_SA, &H_YUY2_SA_DA, &H_W210, &H_W210_DA, &H_W210_SA,
        &H_W210_SA_DA, &H_RGBQ, &H_RGBQ_DA, &H_RGBQ_SA, &H_RGBQ_SA_DA, &H_ALPHA,
    };
    if (level != SimdLevel::scalar)
        for (int i = 0; i < kHorizontalTables; ++i)
            if (scalar[i] == table)
                return level == SimdLevel::avx2 ? &horizontal_tables_isa_avx2[size_t(i)]
                                                : &horizontal_tables_isa_sse41[size_t(i)];
#else
    (void)level;
#endif
    return table;
}

}  // namespace lorvex
