// Helpers for value tests: byte strings from hex text, encoding to vectors, and a
// scoped owner for values built in tests.
#pragma once

#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "zal-ipod-2/serialize.h"

namespace zaltest {

using Bytes = std::vector<unsigned char>;

// "69 04 ff" -> {0x69, 0x04, 0xff}; blanks are ignored.
Bytes hex(const std::string &text);

// serialize() into a vector; empty when it returned NULL.
Bytes encode(const gval *v);

struct GvalFree {
    void operator()(gval *v) const { serialize_free(v); }
};
using GvalPtr = std::unique_ptr<gval, GvalFree>;

inline GvalPtr decode(const Bytes &b) {
    return GvalPtr(unserialize(b.data(), static_cast<uint32_t>(b.size())));
}

// The worked example: hash "serial" => "ab12", "authenticated" => 1.
gval *make_device_hash();

}  // namespace zaltest
