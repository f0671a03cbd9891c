// The variants of the start-code kernels, one per translation unit of this directory. Each is
// defined only where its instruction set can be built (the x86-64 ones on x86-64, NEON on ARM).
#pragma once

#include "tools/start_code.hpp"

namespace vorcal::tools::scan {

extern const StartCodeKernels kPortableKernels;
#if defined(__x86_64__)
extern const StartCodeKernels kSse2Kernels;
extern const StartCodeKernels kAvx2Kernels;
extern const StartCodeKernels kAvx512Kernels;
extern const StartCodeKernels kAvx512VbmiKernels;
#endif
#if defined(__aarch64__) || defined(__arm__)
extern const StartCodeKernels kNeonKernels;
#endif

} // namespace vorcal::tools::scan
