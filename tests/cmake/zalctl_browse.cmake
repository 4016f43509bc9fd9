# zalctl browse end to end: the simulator and zalctl's paths, built before the suite.
if(TARGET zalctl_browse_test AND TARGET zald-sim AND TARGET zalctl)
    target_compile_definitions(zalctl_browse_test PRIVATE
        ZALD_SIM_PATH="$<TARGET_FILE:zald-sim>" ZALCTL_PATH="$<TARGET_FILE:zalctl>")
    add_dependencies(zalctl_browse_test zald-sim zalctl)
endif()
