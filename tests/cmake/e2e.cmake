# End-to-end suites: zalctl and the example application driven against zald-sim. They get
# the programs' paths and build after them; without the tools they compile to skipped tests.
if(TARGET zald-sim)
    foreach(e2e_test zalctl_test example_test)
        if(TARGET ${e2e_test})
            target_compile_definitions(${e2e_test} PRIVATE
                ZALD_SIM_PATH="$<TARGET_FILE:zald-sim>"
                ZALD_SIM_SCENARIO_DIR="${PROJECT_SOURCE_DIR}/tools/zald-sim/scenarios")
            add_dependencies(${e2e_test} zald-sim)
        endif()
    endforeach()
endif()
if(TARGET zalctl AND TARGET zalctl_test)
    target_compile_definitions(zalctl_test PRIVATE ZALCTL_PATH="$<TARGET_FILE:zalctl>")
    add_dependencies(zalctl_test zalctl)
endif()
if(TARGET now_playing AND TARGET example_test)
    target_compile_definitions(example_test PRIVATE
        ZAL_EXAMPLE_NOW_PLAYING="$<TARGET_FILE:now_playing>")
    add_dependencies(example_test now_playing)
endif()
