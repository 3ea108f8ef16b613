#include "run/fpmode.hpp"

#include <cstdint>

#if defined(__x86_64__) || defined(__i386__)
#include <xmmintrin.h>
namespace {
constexpr unsigned kFlushBits = 0x8040u;  // flush-to-zero (bit 15) and denormals-are-zero (bit 6)
}
void SetFloatingPointMode() {
    _mm_setcsr(_mm_getcsr() | kFlushBits);
}
bool FlushToZeroActive() {
    return (_mm_getcsr() & kFlushBits) == kFlushBits;
}
#elif defined(__aarch64__)
namespace {
constexpr uint64_t kFlushBit = 1ull << 24;  // FZ: inputs and results that are denormal become zero
uint64_t ReadFpcr() {
    uint64_t fpcr;
    __asm__ __volatile__("mrs %0, fpcr" : "=r"(fpcr));
    return fpcr;
}
}  // namespace
void SetFloatingPointMode() {
    const uint64_t fpcr = ReadFpcr() | kFlushBit;
    __asm__ __volatile__("msr fpcr, %0" : : "r"(fpcr));
}
bool FlushToZeroActive() {
    return (ReadFpcr() & kFlushBit) != 0;
}
#else
#error "flush-to-zero is not known for this processor"
#endif
