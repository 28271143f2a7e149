# SPDX-License-Identifier: Apache-2.0
# How every target of the project is compiled, and the one way to declare a library of it.

set(CMAKE_CXX_STANDARD 23)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/bin)

find_program(CCACHE_PROGRAM ccache)
if(CCACHE_PROGRAM)
    set(CMAKE_CXX_COMPILER_LAUNCHER ${CCACHE_PROGRAM})
endif()

find_package(PkgConfig REQUIRED)
find_package(Threads REQUIRED)
find_package(fmt REQUIRED)
find_package(spdlog REQUIRED)
find_package(ICU REQUIRED COMPONENTS uc i18n)
find_package(nlohmann_json REQUIRED)
find_package(CLI11 REQUIRED)
find_package(SQLiteCpp REQUIRED)
pkg_check_modules(SQLITE REQUIRED IMPORTED_TARGET sqlite3)
pkg_check_modules(SYSTEMD REQUIRED IMPORTED_TARGET libsystemd)
pkg_check_modules(PUGIXML REQUIRED IMPORTED_TARGET pugixml)
pkg_check_modules(TOMLPLUSPLUS REQUIRED IMPORTED_TARGET tomlplusplus)

set(KEEPSAKES_SANITIZED 0)
if(CMAKE_CXX_FLAGS MATCHES "-fsanitize")
    set(KEEPSAKES_SANITIZED 1)
endif()

add_library(keepsakes_options INTERFACE)
target_compile_features(keepsakes_options INTERFACE cxx_std_23)
target_compile_definitions(keepsakes_options INTERFACE KEEPSAKES_VERSION="${PROJECT_VERSION}"
    $<$<BOOL:${KEEPSAKES_SANITIZED}>:KEEPSAKES_SANITIZED>)
target_compile_options(keepsakes_options INTERFACE
    -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wnon-virtual-dtor
    -Woverloaded-virtual -Wold-style-cast -Werror
    -Wno-missing-field-initializers  # designated initialisers leave the others at their defaults
    # GCC 12's library marks a function that its own stable_sort calls.
    $<$<CXX_COMPILER_ID:Clang>:-Wno-deprecated-declarations>
    # Takes a file that is compiled together with others for a header.
    $<$<AND:$<CXX_COMPILER_ID:GNU>,$<BOOL:${CMAKE_UNITY_BUILD}>>:-Wno-subobject-linkage>)

# keepsakes_library(<folder> [SOURCES ...] [DEPS <folder>...] [PUBLIC ...] [PRIVATE ...])
#
# One static library a folder, declared in that folder. Its headers are seen as "<folder>/Name.h",
# and only by targets that link it: each library exports an include directory of its own that holds
# nothing but a link to its folder, so that an include of a folder that is not linked does not
# compile.
function(keepsakes_library name)
    cmake_parse_arguments(ARG "" "" "SOURCES;DEPS;PUBLIC;PRIVATE" ${ARGN})
    set(include_root ${CMAKE_BINARY_DIR}/include/${name})
    file(MAKE_DIRECTORY ${include_root})
    file(CREATE_LINK ${CMAKE_CURRENT_SOURCE_DIR} ${include_root}/${name} SYMBOLIC)
    list(TRANSFORM ARG_DEPS PREPEND keepsakes_)
    if(ARG_SOURCES)
        add_library(keepsakes_${name} STATIC ${ARG_SOURCES})
        target_include_directories(keepsakes_${name} PUBLIC ${include_root})
        target_link_libraries(keepsakes_${name} PUBLIC ${ARG_DEPS} ${ARG_PUBLIC}
                              PRIVATE keepsakes_options ${ARG_PRIVATE})
    else()
        add_library(keepsakes_${name} INTERFACE)
        target_include_directories(keepsakes_${name} INTERFACE ${include_root})
        target_link_libraries(keepsakes_${name} INTERFACE ${ARG_DEPS} ${ARG_PUBLIC})
    endif()
endfunction()

# keepsakes_program(<name> SOURCES ... [DEPS <folder>...] [PRIVATE ...])
function(keepsakes_program name)
    cmake_parse_arguments(ARG "" "" "SOURCES;DEPS;PRIVATE" ${ARGN})
    add_executable(${name} ${ARG_SOURCES})
    list(TRANSFORM ARG_DEPS PREPEND keepsakes_)
    target_link_libraries(${name} PRIVATE keepsakes_options ${ARG_DEPS} ${ARG_PRIVATE})
endfunction()

# keepsakes_test(<folder> SOURCES ... [DEPS <folder>...] [PRIVATE ...] [PRIVATE_BUS])
#
# One test program a folder, its tests known to ctest one by one. ctest fails when it finds none.
# With PRIVATE_BUS each test runs on a session bus of its own.
function(keepsakes_test folder)
    cmake_parse_arguments(TEST "PRIVATE_BUS" "" "" ${ARGN})
    set(name keepsakes_${folder}_tests)
    # Seconds for one test; everything takes several times as long under a sanitizer.
    set(timeout 60)
    if(KEEPSAKES_SANITIZED)
        set(timeout 600)
    endif()
    keepsakes_program(${name} ${TEST_UNPARSED_ARGUMENTS})
    if(TEST_PRIVATE_BUS)
        set_target_properties(${name} PROPERTIES CROSSCOMPILING_EMULATOR "dbus-run-session;--")
    endif()
    target_link_libraries(${name} PRIVATE keepsakes_support GTest::gmock GTest::gtest_main)
    gtest_discover_tests(${name} TEST_PREFIX "${folder}." DISCOVERY_TIMEOUT 60
                         PROPERTIES TIMEOUT ${timeout})
endfunction()
