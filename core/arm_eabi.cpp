// ARM EABI division-by-zero hooks. The integer division helpers that the compiler takes from
// libgcc on ARMv7 call these on a zero divisor; libgcc's own versions raise SIGFPE through the
// C library, which would make libvorcal import raise(). Every divisor in the library is tested
// before it divides, so these only keep that import out: they return the quotient register.
#if defined(__arm__) && defined(__ARM_EABI__)

extern "C" {

// The run-time ABI names these hooks but no header declares them.
int __aeabi_idiv0(int iReturn);
long long __aeabi_ldiv0(long long iReturn);

__attribute__((visibility("hidden"), used)) int __aeabi_idiv0(int iReturn)
{
    return iReturn;
}

__attribute__((visibility("hidden"), used)) long long __aeabi_ldiv0(long long iReturn)
{
    return iReturn;
}

} // extern "C"

#endif
