// The vertical tables of this file's instruction set (AVX2).
#include "vertical/vertical_vector.h"

namespace lorvex {
constexpr std::array<VerticalKernelTable, kVectorVerticalTables> LORVEX_ISA_NAME(vertical_tables) = vertical::make_vector_tables();
}
