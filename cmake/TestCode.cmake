# How the tests' own sources are compiled. What is tested is compiled as it is shipped; the tests
# themselves are not worth the optimizer's time. Release builds keep what a stack trace needs.
set(orva_test_options -O0 $<$<CONFIG:RelWithDebInfo>:-g1>)

# Reading the libraries' headers takes longer than most tests' own lines; with ORVA_PCH they are read
# once a build. No header of this project is among them: each change of it would compile every test
# anew.
if(ORVA_PCH AND ORVA_TESTS)
    file(CONFIGURE OUTPUT ${CMAKE_BINARY_DIR}/tests/library_headers.cpp CONTENT "")
    add_library(library_headers OBJECT EXCLUDE_FROM_ALL
        ${CMAKE_BINARY_DIR}/tests/library_headers.cpp)
    target_link_libraries(library_headers PRIVATE orva_base GTest::gmock)
    target_compile_options(library_headers PRIVATE ${orva_test_options})
    target_precompile_headers(library_headers PRIVATE
        <algorithm> <array> <atomic> <chrono> <filesystem> <fstream> <functional> <map> <memory>
        <optional> <random> <set> <sstream> <stdexcept> <string> <string_view> <thread> <vector>
        <gmock/gmock.h> <gtest/gtest.h> <json/json.h>)
endif()

# orva_test_code(TARGET): compiles the target's sources that way.
function(orva_test_code target)
    if(NOT ORVA_TESTS)
        # The fuzz targets run some of it too, as fast as they can.
        return()
    endif()
    target_compile_options(${target} PRIVATE ${orva_test_options})
    if(TARGET library_headers)
        # As the headers were; a program's own -fPIE would make them unfit for it.
        target_compile_options(${target} PRIVATE -fPIC)
        target_precompile_headers(${target} REUSE_FROM library_headers)
    endif()
endfunction()
