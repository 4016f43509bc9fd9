# End-to-end suites: zalctl and the example application driven against zald-sim. They get
# the programs' paths and build after them; without the tools they compile to skipped tests.
if(TARGET zald-sim)
    foreach(e2e_test zalctl_test zalctl_playback_test zalctl_media_test example_test)
        if(TARGET ${e2e_test})
            target_compile_definitions(${e2e_test} PRIVATE
                ZALD_SIM_PATH="$<TARGET_FILE:zald-sim>"
                ZALD_SIM_SCENARIO_DIR="${PROJECT_SOURCE_DIR}/tools/zald-sim/scenarios")
            add_dependencies(${e2e_test} zald-sim)
        endif()
    endforeach()
endif()
foreach(zalctl_suite zalctl_test zalctl_media_test)
    if(TARGET zalctl AND TARGET ${zalctl_suite})
        target_compile_definitions(${zalctl_suite} PRIVATE ZALCTL_PATH="$<TARGET_FILE:zalctl>")
        add_dependencies(${zalctl_suite} zalctl)
    endif()
endforeach()
# The artwork suite decodes the PNG files zalctl writes.
if(TARGET zalctl_playback_test)
    find_package(PNG REQUIRED)
    target_link_libraries(zalctl_playback_test PRIVATE PNG::PNG)
    if(TARGET zalctl)
        target_compile_definitions(zalctl_playback_test PRIVATE
            ZALCTL_PATH="$<TARGET_FILE:zalctl>")
        add_dependencies(zalctl_playback_test zalctl)
    endif()
endif()
if(TARGET now_playing AND TARGET example_test)
    target_compile_definitions(example_test PRIVATE
        ZAL_EXAMPLE_NOW_PLAYING="$<TARGET_FILE:now_playing>")
    add_dependencies(example_test now_playing)
endif()
