// Configuration keys backed by the daemon context: reading one reads the context, writing
// one goes through the context's setter.
#pragma once

#include "config_store.h"
#include "zal-ipod-2/daemon.h"

namespace sim {

// ctx must outlive the store.
void bind_context_keys(ConfigStore &store, context &ctx);

}  // namespace sim
