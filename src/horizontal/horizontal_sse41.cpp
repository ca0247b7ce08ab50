// The horizontal tables of this file's instruction set (SSE41): the samplers of
// horizontal_vector.h in the slots they serve.
#include "horizontal/horizontal_kernels.h"
#include "horizontal/horizontal_vector.h"
#include "horizontal/table_builder.h"

namespace lorvex {
using VectorTables = horizontal::TableSet<horizontal::BankSamplerV, horizontal::AreaSamplerV, horizontal::LinearSamplerV>;
constexpr std::array<HorizontalKernelTable, kHorizontalTables> LORVEX_ISA_NAME(horizontal_tables) = VectorTables::tables;
}
