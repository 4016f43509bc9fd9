// Helpers for value tests.
#include "value_builders.h"

#include <cctype>

namespace zaltest {

Bytes hex(const std::string &text) {
    Bytes out;
    int high = -1;
    for (char c : text) {
        if (!std::isxdigit(static_cast<unsigned char>(c))) continue;
        int nibble = std::isdigit(static_cast<unsigned char>(c))
                         ? c - '0'
                         : std::tolower(static_cast<unsigned char>(c)) - 'a' + 10;
        if (high < 0) {
            high = nibble;
        } else {
            out.push_back(static_cast<unsigned char>(high << 4 | nibble));
            high = -1;
        }
    }
    return out;
}

Bytes encode(const gval *v) {
    uint32_t len = 0;
    unsigned char *buf = serialize(v, &len);
    if (buf == nullptr) return {};
    Bytes out(buf, buf + len);
    std::free(buf);
    return out;
}

gval *make_device_hash() {
    gval *h = serialize_hash();
    serialize_hash_add(h, "serial", serialize_string("ab12"));
    serialize_hash_add(h, "authenticated", serialize_int(1));
    return h;
}

}  // namespace zaltest
