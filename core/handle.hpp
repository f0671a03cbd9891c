// The process-wide CAL handle as the rest of the library sees it.
#pragma once

#include <vorcal/core.h>

namespace vorcal::core {

// The handle vorCAL_GetHandle handed out and the last vorCAL_ReleaseHandle has not freed yet,
// or null. A codec instance compares its m_hCAL with it before touching the handle, so that an
// instance that outlives its handle never reads freed memory.
const CALHandle *LiveHandle() noexcept;

} // namespace vorcal::core
