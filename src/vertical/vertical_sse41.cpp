// The vertical tables with the SSE41 kernels in the slots they serve.
#include "vertical/vertical_vector.h"

namespace lorvex {

extern const VerticalKernelTable V_YUY2_SSE41;
extern const VerticalKernelTable V_W210_SSE41;
extern const VerticalKernelTable V_RGBQ_SSE41;
extern const VerticalKernelTable V_ALPHA_SSE41;
extern const VerticalKernelTable V_YUY2_STRAIGHT_SSE41;
extern const VerticalKernelTable V_W210_STRAIGHT_SSE41;
extern const VerticalKernelTable V_RGBQ_STRAIGHT_SSE41;

constexpr VerticalKernelTable V_YUY2_SSE41 = vertical::make_vector_table<SrcYuy2, vertical::edge7_yuy2_C>();
constexpr VerticalKernelTable V_W210_SSE41 = vertical::make_vector_table<SrcW210, nullptr>();
constexpr VerticalKernelTable V_RGBQ_SSE41 = vertical::make_vector_table<SrcRgbq, vertical::edge7_rgbq_C>();
constexpr VerticalKernelTable V_ALPHA_SSE41 = vertical::make_vector_table<SrcAlpha, nullptr>();
constexpr VerticalKernelTable V_YUY2_STRAIGHT_SSE41 = vertical::make_straight_vector_table<SrcYuy2>();
constexpr VerticalKernelTable V_W210_STRAIGHT_SSE41 = vertical::make_straight_vector_table<SrcW210>();
constexpr VerticalKernelTable V_RGBQ_STRAIGHT_SSE41 = vertical::make_straight_vector_table<SrcRgbq>();

}  // namespace lorvex
