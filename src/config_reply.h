// Runtime configuration replies: the keys of the SET_CONFIG and GET_CONFIG replies and
// their decoding, separate from the sending so that both can be tested on plain values.
#pragma once

#include <cstdint>

#include "zal-ipod-2/serialize.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace zal::config {

// Keys of the reply hashes.
constexpr const char *kUpdatedConfigKey = "config_updated_cfg";
constexpr const char *kUpdatedContextKey = "config_updated_ctx";
constexpr const char *kValueKey = "config_val";
constexpr const char *kErrorCodeKey = "config_val_errorcode";

// Result of get_reply_result() when the reply holds neither a value nor an error code.
constexpr int32_t kNoConfigValue = -2;
// Result of set_reply_result() when there is no usable reply.
constexpr int32_t kNoSetReply = -1;

// Decoded SET_CONFIG reply: 1 when the configuration or the context was updated, 0 when
// neither was, -1 when reply is not a hash. Refusals are logged as errors under
// "zal_ipod_set_config_sync" with key and value. An outcome missing from the reply, or
// not an integer, counts as not updated and is not reported (the daemon always sends
// both; a reply without them tells nothing about what happened).
int32_t set_reply_result(const gval *reply, const char *key, const char *value);

// Decoded GET_CONFIG reply: a string "config_val" is copied whole, terminator included,
// into out (which must hold the longest value the daemon can return) and gives 1; else an
// integer "config_val_errorcode" is the result; else -2, out untouched. A value that is
// not a string counts as absent. A null out receives nothing and gives -2.
int32_t get_reply_result(const gval *reply, char *out);

}  // namespace zal::config
