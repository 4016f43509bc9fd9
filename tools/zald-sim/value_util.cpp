// Argument readers and the JSON-to-value conversion used by scenario events.
#include "value_util.h"

#include <limits>
#include <stdexcept>
#include <vector>

namespace sim {

bool value_as_int(const gval *v, int32_t *out) {
    if (v == nullptr || serialize_type(v) != SERIALIZE_INT) return false;
    *out = serialize_get_int(v);
    return true;
}

bool value_as_string(const gval *v, std::string *out) {
    if (v == nullptr || serialize_type(v) != SERIALIZE_STRING) return false;
    *out = serialize_get_string(v);
    return true;
}

const gval *array_item(const gval *v, uint32_t index) {
    if (v == nullptr || serialize_type(v) != SERIALIZE_ARRAY) return nullptr;
    if (index >= static_cast<uint32_t>(serialize_array_count(v))) return nullptr;
    return serialize_array_get(v, index);
}

namespace {

int hex_digit(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

ValuePtr bytes_from_hex(const std::string &hex) {
    if (hex.size() % 2 != 0)
        throw std::invalid_argument("\"$bytes\" needs an even number of hex digits");
    std::vector<unsigned char> bytes;
    bytes.reserve(hex.size() / 2);
    for (size_t i = 0; i < hex.size(); i += 2) {
        int hi = hex_digit(hex[i]), lo = hex_digit(hex[i + 1]);
        if (hi < 0 || lo < 0)
            throw std::invalid_argument("\"$bytes\" holds a character that is not a hex digit");
        bytes.push_back(static_cast<unsigned char>(hi * 16 + lo));
    }
    return ValuePtr(serialize_bytes(bytes.data(), static_cast<uint32_t>(bytes.size())));
}

}  // namespace

ValuePtr json_to_value(const nlohmann::json &j) {
    using nlohmann::json;
    switch (j.type()) {
        case json::value_t::boolean:
            return make_int(j.get<bool>() ? 1 : 0);
        case json::value_t::number_integer:
        case json::value_t::number_unsigned: {
            // Unsigned values above INT32_MAX keep their 32 bits, as the wire does.
            if (j.is_number_unsigned() && j.get<uint64_t>() <= std::numeric_limits<uint32_t>::max())
                return make_int(static_cast<int32_t>(j.get<uint32_t>()));
            int64_t n = j.get<int64_t>();
            if (n < std::numeric_limits<int32_t>::min() || n > std::numeric_limits<int32_t>::max())
                throw std::invalid_argument("integer does not fit in 32 bits");
            return make_int(static_cast<int32_t>(n));
        }
        case json::value_t::number_float:
            return ValuePtr(serialize_float(j.get<float>()));
        case json::value_t::string:
            return make_string(j.get<std::string>());
        case json::value_t::array: {
            ValuePtr array(serialize_array());
            for (const auto &item : j)
                serialize_array_add(array.get(), json_to_value(item).release());
            return array;
        }
        case json::value_t::object: {
            if (j.size() == 1 && j.contains("$bytes")) {
                if (!j["$bytes"].is_string())
                    throw std::invalid_argument("\"$bytes\" must be a string");
                return bytes_from_hex(j["$bytes"].get<std::string>());
            }
            ValuePtr hash(serialize_hash());
            for (const auto &[key, item] : j.items()) {
                if (key.size() > 255) throw std::invalid_argument("hash key longer than 255 bytes");
                serialize_hash_add(hash.get(), key.c_str(), json_to_value(item).release());
            }
            return hash;
        }
        case json::value_t::null:
            return ValuePtr(serialize_hash());
        default:
            throw std::invalid_argument("value kind cannot be sent");
    }
}

}  // namespace sim
