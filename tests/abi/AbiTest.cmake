# ABI check of include/SaHpi.h: every size, alignment, offset, value and
# prototype of HPI A.01.01 on this host, as listed in tests/data/abi-a0101.tsv.
# Included from tests/CMakeLists.txt. The check needs the header only, so it
# links nothing of the library.

# Paths relative to this file, so the fragment works from any including project.
get_filename_component(KVI_ABI_ROOT "${CMAKE_CURRENT_LIST_DIR}/../.." ABSOLUTE)
set(KVI_ABI_TSV "${KVI_ABI_ROOT}/tests/data/abi-a0101.tsv")
set(KVI_ABI_GENERATOR "${KVI_ABI_ROOT}/cmake/GenerateAbiTest.cmake")
set(KVI_ABI_SOURCE "${CMAKE_CURRENT_BINARY_DIR}/AbiCheck.c")

add_custom_command(
    OUTPUT "${KVI_ABI_SOURCE}"
    COMMAND "${CMAKE_COMMAND}"
            "-DKVI_ABI_TSV=${KVI_ABI_TSV}"
            "-DKVI_ABI_OUTPUT=${KVI_ABI_SOURCE}"
            -P "${KVI_ABI_GENERATOR}"
    DEPENDS "${KVI_ABI_TSV}" "${KVI_ABI_GENERATOR}"
    COMMENT "Generating the SaHpi.h ABI check from abi-a0101.tsv"
    VERBATIM)

add_executable(KviAbiTest "${KVI_ABI_SOURCE}")
set_target_properties(KviAbiTest PROPERTIES
    C_STANDARD 11
    C_STANDARD_REQUIRED ON
    C_EXTENSIONS OFF)
target_include_directories(KviAbiTest PRIVATE "${KVI_ABI_ROOT}/include")
# Incompatible prototypes are errors through -Werror; -pedantic keeps the
# header honest C11.
target_compile_options(KviAbiTest PRIVATE -Wall -Wextra -Werror -pedantic)

add_test(NAME KviAbiTest COMMAND KviAbiTest)
set_tests_properties(KviAbiTest PROPERTIES LABELS abi)
