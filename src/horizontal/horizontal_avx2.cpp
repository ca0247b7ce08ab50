// The horizontal tables with the AVX2 samplers in the slots they serve.
#include "horizontal/horizontal_kernels.h"
#include "horizontal/horizontal_vector.h"
#include "horizontal/table_builder.h"

namespace lorvex {

extern const HorizontalKernelTable H_TABLES_AVX2[13];

template <class Units, int T>
using VectorBank = horizontal::BankSamplerV<Units, T>;

constexpr HorizontalKernelTable H_TABLES_AVX2[13] = {
    horizontal::TableSet<VectorBank>::tables[0],  horizontal::TableSet<VectorBank>::tables[1],
    horizontal::TableSet<VectorBank>::tables[2],  horizontal::TableSet<VectorBank>::tables[3],
    horizontal::TableSet<VectorBank>::tables[4],  horizontal::TableSet<VectorBank>::tables[5],
    horizontal::TableSet<VectorBank>::tables[6],  horizontal::TableSet<VectorBank>::tables[7],
    horizontal::TableSet<VectorBank>::tables[8],  horizontal::TableSet<VectorBank>::tables[9],
    horizontal::TableSet<VectorBank>::tables[10], horizontal::TableSet<VectorBank>::tables[11],
    horizontal::TableSet<VectorBank>::tables[12],
};

}  // namespace lorvex
