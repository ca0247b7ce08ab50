// The horizontal kernel tables. Each is the product of a destination layout
// and a composition family; all share the walk of walk.h and the samplers of
// sample_area.h and sample_taps.h.
#pragma once

#include "shared/map_context.h"

namespace lorvex {
extern const HorizontalKernelTable H_YUY2;
extern const HorizontalKernelTable H_W210;
extern const HorizontalKernelTable H_RGBQ;
}  // namespace lorvex
