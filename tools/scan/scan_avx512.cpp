// The AVX-512BW variant. Built with -mavx512f -mavx512bw -mbmi -mbmi2; used only when the CPU
// reports them and the operating system saves the vector state.
#if defined(__x86_64__)
#include "tools/scan/avx512.hpp"
#include "tools/scan/variants.hpp"

namespace vorcal::tools::scan {

const StartCodeKernels kAvx512Kernels = KernelsOf<Avx512<false>>("avx512bw");

} // namespace vorcal::tools::scan
#endif
