// The horizontal kernel tables. Each is the product of a destination layout
// and a composition family (plain, _DA destination alpha, _SA source alpha,
// _SA_DA both, and alpha only); all share the walk of walk.h and the samplers
// of sample_area.h and sample_taps.h.
#pragma once

#include "shared/map_context.h"

namespace lorvex {
enum class SimdLevel : int;

extern const HorizontalKernelTable H_YUY2;
extern const HorizontalKernelTable H_YUY2_DA;
extern const HorizontalKernelTable H_YUY2_SA;
extern const HorizontalKernelTable H_YUY2_SA_DA;
extern const HorizontalKernelTable H_W210;
extern const HorizontalKernelTable H_W210_DA;
extern const HorizontalKernelTable H_W210_SA;
extern const HorizontalKernelTable H_W210_SA_DA;
extern const HorizontalKernelTable H_RGBQ;
extern const HorizontalKernelTable H_RGBQ_DA;
extern const HorizontalKernelTable H_RGBQ_SA;
extern const HorizontalKernelTable H_RGBQ_SA_DA;
extern const HorizontalKernelTable H_ALPHA;

// The thirteen tables above with vector samplers, one set per instruction
// set, in the order of their declarations.
constexpr int kHorizontalTables = 13;
extern const std::array<HorizontalKernelTable, kHorizontalTables> horizontal_tables_isa_sse41;
extern const std::array<HorizontalKernelTable, kHorizontalTables> horizontal_tables_isa_avx2;

// The twin of a table whose samplers use the vectors of `level`, where one
// exists; the table itself otherwise.
const HorizontalKernelTable* horizontal_table_for(const HorizontalKernelTable* table, SimdLevel level);
}  // namespace lorvex
