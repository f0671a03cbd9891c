// The AVX-512VBMI variant: the AVX-512BW one with the shifted vectors of the fused copy made by
// byte permutation instead of loads. Built with -mavx512vbmi in addition; used only when the CPU
// reports it too.
#if defined(__x86_64__)
#include "tools/scan/avx512.hpp"
#include "tools/scan/variants.hpp"

namespace vorcal::tools::scan {

const StartCodeKernels kAvx512VbmiKernels = KernelsOf<Avx512<true>>("avx512vbmi");

} // namespace vorcal::tools::scan
#endif
