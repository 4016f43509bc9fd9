# The zald-sim suites start the simulator binary: they get its path and build after it.
# Without the tools (ZAL_BUILD_TOOLS=OFF) they compile to skipped tests.
file(GLOB ZAL_SIM_TEST_SOURCES CONFIGURE_DEPENDS ${CMAKE_CURRENT_SOURCE_DIR}/sim_*_test.cpp)
foreach(sim_test_source ${ZAL_SIM_TEST_SOURCES})
    get_filename_component(sim_test ${sim_test_source} NAME_WE)
    if(TARGET zald-sim)
        target_compile_definitions(${sim_test} PRIVATE
            ZALD_SIM_PATH="$<TARGET_FILE:zald-sim>"
            ZALD_SIM_SCENARIO_DIR="${PROJECT_SOURCE_DIR}/tools/zald-sim/scenarios")
        add_dependencies(${sim_test} zald-sim)
    endif()
endforeach()
