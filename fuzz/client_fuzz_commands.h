// What the client fuzz harness drives: one _sync command per selector (every family's
// commands belong here), and readers that touch every accessor of an event and of the
// handle's cached state, so that whatever a hostile reply stored is read back.
#pragma once

#include "zal-ipod-2/zal-ipod-2.h"

// Runs the _sync command chosen by selector (taken modulo the table's size).
void zal_fuzz_run_command(zal_ipod_handle *h, unsigned selector);
// Number of commands in the table.
unsigned zal_fuzz_command_count();
// Calls every accessor of the event.
void zal_fuzz_read_event(const zal_ipod_event *event);
// Calls every accessor of the handle's device list and cached state.
void zal_fuzz_read_handle(zal_ipod_handle *h);
