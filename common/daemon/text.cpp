// Text helpers of the daemon context: cut copies and overflow-safe decimal parsing.
#include <cctype>
#include <cstring>
#include <limits>

#include "common/daemon/context_internal.h"

namespace zal::daemon {

void copy_cut(char *dst, std::size_t capacity, const char *src) {
    if (capacity == 0) return;
    std::size_t n = src ? strnlen(src, capacity - 1) : 0;
    std::memcpy(dst, src ? src : "", n);
    dst[n] = '\0';
}

int32_t parse_decimal(const char *text) {
    if (text == nullptr) return 0;
    const char *p = text;
    while (std::isspace(static_cast<unsigned char>(*p))) ++p;
    bool negative = false;
    if (*p == '+' || *p == '-') negative = *p++ == '-';
    int64_t value = 0;
    constexpr int64_t kLimit = int64_t{std::numeric_limits<int32_t>::max()} + 1;
    for (; *p >= '0' && *p <= '9'; ++p) {
        value = value * 10 + (*p - '0');
        if (value > kLimit) value = kLimit;  // keeps the sum bounded; clamped below
    }
    if (negative) value = -value;
    if (value > std::numeric_limits<int32_t>::max()) value = std::numeric_limits<int32_t>::max();
    return static_cast<int32_t>(value);
}

}  // namespace zal::daemon
