// The instruction set a source file is compiled for. Code in headers that
// vector source files include is placed in an inline namespace named after it,
// so that the same template compiled for two instruction sets gives two
// distinct functions, and the linker never takes the vector build of a helper
// for a caller on a processor without those instructions.
#pragma once

#if defined(LORVEX_ISA_AVX2)
#define LORVEX_ISA_NAMESPACE isa_avx2
#elif defined(LORVEX_ISA_SSE41)
#define LORVEX_ISA_NAMESPACE isa_sse41
#else
#define LORVEX_ISA_NAMESPACE isa_scalar
#endif

// A name with the instruction set appended, for what each vector source file
// defines once: NAME_isa_sse41, NAME_isa_avx2.
#define LORVEX_CAT_(a, b) a##_##b
#define LORVEX_CAT(a, b) LORVEX_CAT_(a, b)
#define LORVEX_ISA_NAME(name) LORVEX_CAT(name, LORVEX_ISA_NAMESPACE)

// Small vector helpers that a kernel's inner loop calls: inlined whatever the
// compiler's count of their callers, since a call would spill the registers
// the loop keeps.
#if defined(__GNUC__)
#define LORVEX_ALWAYS_INLINE inline __attribute__((always_inline))
#else
#define LORVEX_ALWAYS_INLINE inline
#endif
