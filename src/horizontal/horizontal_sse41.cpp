// The horizontal tables with the SSE41 samplers in the slots they serve.
#include "horizontal/horizontal_kernels.h"
#include "horizontal/horizontal_vector.h"
#include "horizontal/table_builder.h"

namespace lorvex {

extern const HorizontalKernelTable H_TABLES_SSE41[13];

template <class Units, int T>
using VectorBank = horizontal::BankSamplerV<Units, T>;
template <class Units>
using VectorArea = horizontal::AreaSamplerV<Units>;
template <class Units>
using VectorLinear = horizontal::LinearSamplerV<Units>;
using Vector = horizontal::TableSet<VectorBank, VectorArea, VectorLinear>;

constexpr HorizontalKernelTable H_TABLES_SSE41[13] = {
    Vector::tables[0],  Vector::tables[1],
    Vector::tables[2],  Vector::tables[3],
    Vector::tables[4],  Vector::tables[5],
    Vector::tables[6],  Vector::tables[7],
    Vector::tables[8],  Vector::tables[9],
    Vector::tables[10], Vector::tables[11],
    Vector::tables[12],
};

}  // namespace lorvex
