// Event records: made by the dispatcher, read through the exported accessors.
#pragma once

#include "zal-ipod-2/zal-ipod-2.h"
