// Owning handles and small builders for values, and the conversion of scenario JSON into
// values (event data written in a scenario file goes out on the wire as it stands).
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include <nlohmann/json.hpp>

#include "zal-ipod-2/serialize.h"

namespace sim {

struct ValueDeleter {
    void operator()(gval *v) const { serialize_free(v); }
};
using ValuePtr = std::unique_ptr<gval, ValueDeleter>;

// Builds a hash from (key, value) pairs; values are taken over.
class HashBuilder {
  public:
    HashBuilder() : hash_(serialize_hash()) {}
    HashBuilder &add(const char *key, gval *value) {
        serialize_hash_add(hash_.get(), key, value);
        return *this;
    }
    HashBuilder &add(const char *key, int32_t value) { return add(key, serialize_int(value)); }
    HashBuilder &add(const char *key, const std::string &value) {
        return add(key, serialize_string(value.c_str()));
    }
    ValuePtr take() { return std::move(hash_); }

  private:
    ValuePtr hash_;
};

inline ValuePtr make_int(int32_t v) {
    return ValuePtr(serialize_int(v));
}
inline ValuePtr make_string(const std::string &s) {
    return ValuePtr(serialize_string(s.c_str()));
}

// Reads an argument: the integer itself, or element `index` of an argument array.
bool value_as_int(const gval *v, int32_t *out);
bool value_as_string(const gval *v, std::string *out);
const gval *array_item(const gval *v, uint32_t index);

// Scenario JSON to a value: numbers without a fraction become ints, other numbers floats,
// booleans ints 0/1, strings strings, arrays arrays, objects hashes, and an object with the
// single key "$bytes" holding hexadecimal text a bytes value. Null becomes an empty hash.
// Throws std::invalid_argument with a reason when the JSON cannot be represented.
ValuePtr json_to_value(const nlohmann::json &j);

}  // namespace sim
