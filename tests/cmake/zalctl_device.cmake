# zalctl's device-information, accessory-input and communications commands end to end: the
# same program paths as the other end-to-end suites.
if(TARGET zald-sim AND TARGET zalctl AND TARGET zalctl_device_test)
    target_compile_definitions(zalctl_device_test PRIVATE
        ZALD_SIM_PATH="$<TARGET_FILE:zald-sim>" ZALCTL_PATH="$<TARGET_FILE:zalctl>")
    add_dependencies(zalctl_device_test zald-sim zalctl)
endif()
