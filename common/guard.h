// The C boundary: exported functions run their body through zal_guard so that no C++
// exception (in practice std::bad_alloc from a standard container) ever crosses it.
#pragma once

#include <exception>
#include <new>

#include "common/log.h"

template <class R, class F>
R zal_guard_at(const char *function, int line, R failure, F &&body) noexcept {
    try {
        return body();
    } catch (const std::bad_alloc &) {
        zal_log_error_at(function, line, "%s: out of memory\n", function);
    } catch (const std::exception &e) {
        zal_log_error_at(function, line, "%s: %s\n", function, e.what());
    } catch (...) {
        zal_log_error_at(function, line, "%s: unexpected failure\n", function);
    }
    return failure;
}

// ZAL_GUARD(failure_result, [&] { ... return result; })
#define ZAL_GUARD(failure, ...) zal_guard_at(__func__, __LINE__, failure, __VA_ARGS__)
