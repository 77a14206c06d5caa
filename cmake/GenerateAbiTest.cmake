# Writes the C11 source of the ABI check of include/SaHpi.h from the table of
# published HPI A.01.01 binary facts (tests/data/abi-a0101.tsv).
#
#   cmake -DKVI_ABI_TSV=<table.tsv> -DKVI_ABI_OUTPUT=<AbiCheck.c> -P GenerateAbiTest.cmake
#
# Each row becomes one entry of a table that the program compares at run
# time, so a wrong row is reported by name instead of failing the build with
# a wall of static assertions. Both x86 columns are compiled in; the program
# picks the one of the pointer size it was built for. Function prototypes are
# also checked at compile time: a mismatch is an incompatible-pointer error
# under -Werror, and the table reports it again for builds without -Werror.
# Nothing in the generated program refers to the functions at link time, so
# it needs the header only.

cmake_minimum_required(VERSION 3.25)

foreach(_var KVI_ABI_TSV KVI_ABI_OUTPUT)
    if(NOT DEFINED ${_var} OR "${${_var}}" STREQUAL "")
        message(FATAL_ERROR "GenerateAbiTest: -D${_var}=... is required")
    endif()
endforeach()
if(NOT EXISTS "${KVI_ABI_TSV}")
    message(FATAL_ERROR "GenerateAbiTest: ${KVI_ABI_TSV} does not exist")
endif()

# Turns a decimal string from the table into a C constant of type long long.
# INT64_MIN has no literal of its own: its magnitude does not fit long long.
function(_kvi_abi_literal _out _value _where)
    if(NOT _value MATCHES "^(-?)([0-9]+)$")
        message(FATAL_ERROR "GenerateAbiTest: ${_where}: '${_value}' is not a decimal integer")
    endif()
    set(_sign "${CMAKE_MATCH_1}")
    string(REGEX REPLACE "^0+([0-9])" "\\1" _magnitude "${CMAKE_MATCH_2}")
    string(LENGTH "${_magnitude}" _digits)
    if(_digits GREATER 19
       OR (_digits EQUAL 19 AND _sign STREQUAL "" AND _magnitude STRGREATER "9223372036854775807")
       OR (_digits EQUAL 19 AND _sign STREQUAL "-" AND _magnitude STRGREATER "9223372036854775808"))
        message(FATAL_ERROR "GenerateAbiTest: ${_where}: ${_value} does not fit in long long")
    endif()
    if(_sign STREQUAL "-" AND _magnitude STREQUAL "9223372036854775808")
        set(${_out} "(-9223372036854775807LL - 1)" PARENT_SCOPE)
    elseif(_sign STREQUAL "-")
        set(${_out} "(-${_magnitude}LL)" PARENT_SCOPE)
    else()
        set(${_out} "${_magnitude}LL" PARENT_SCOPE)
    endif()
endfunction()

set(_identifier "^[A-Za-z_][A-Za-z0-9_]*$")
# A prototype as the table writes it, e.g. "SaErrorT (SaHpiSessionIdT, SaHpiTimeT *)".
# Only what a C type name needs, so nothing else can reach the generated code.
set(_prototype "^[A-Za-z_][A-Za-z0-9_ ]*\\([A-Za-z0-9_ *,]*\\)$")

file(STRINGS "${KVI_ABI_TSV}" _lines ENCODING UTF-8)
list(LENGTH _lines _lineCount)
if(_lineCount LESS 2)
    message(FATAL_ERROR "GenerateAbiTest: ${KVI_ABI_TSV} has no rows")
endif()

set(_rows "")
set(_prototypes "")
set(_rowCount 0)
set(_lineNumber 0)
foreach(_line IN LISTS _lines)
    math(EXPR _lineNumber "${_lineNumber} + 1")
    string(REGEX REPLACE "\r$" "" _line "${_line}")
    if(_line STREQUAL "")
        continue()
    endif()
    set(_where "${KVI_ABI_TSV} line ${_lineNumber}")
    if(NOT _line MATCHES "^([^\t]*)\t([^\t]*)\t([^\t]*)\t([^\t]*)\t([^\t]*)$")
        message(FATAL_ERROR "GenerateAbiTest: ${_where}: expected 5 tab-separated columns")
    endif()
    set(_kind "${CMAKE_MATCH_1}")
    set(_name "${CMAKE_MATCH_2}")
    set(_member "${CMAKE_MATCH_3}")
    set(_lp64 "${CMAKE_MATCH_4}")
    set(_ilp32 "${CMAKE_MATCH_5}")

    if(_lineNumber EQUAL 1)
        if(NOT _line STREQUAL "kind\tname\tmember\tlp64\tilp32")
            message(FATAL_ERROR "GenerateAbiTest: ${_where}: unexpected header row")
        endif()
        continue()
    endif()

    if(NOT _name MATCHES "${_identifier}")
        message(FATAL_ERROR "GenerateAbiTest: ${_where}: '${_name}' is not a C identifier")
    endif()

    if(_kind STREQUAL "function")
        if(NOT _member MATCHES "${_prototype}")
            message(FATAL_ERROR "GenerateAbiTest: ${_where}: '${_member}' is not a prototype")
        endif()
        # "R (P)" is the function type; "R (*)(P)" the pointer to convert to.
        string(REGEX REPLACE "^([^(]*)\\((.*)\\)$" "\\1(*)(\\2)" _pointer "${_member}")
        string(APPEND _prototypes "    (void)sizeof((${_pointer}){${_name}});\n")
        string(APPEND _rows "    {\"function\", \"${_name}\", \"${_member}\", 1,\n"
            "     __builtin_types_compatible_p(__typeof__(${_name}), ${_member}), {1, 1}},\n")
    else()
        _kvi_abi_literal(_lp64Literal "${_lp64}" "${_where}")
        _kvi_abi_literal(_ilp32Literal "${_ilp32}" "${_where}")
        set(_expected "{${_lp64Literal}, ${_ilp32Literal}}")
        if(_kind MATCHES "^(offsetof|membersize)$")
            if(NOT _member MATCHES "${_identifier}")
                message(FATAL_ERROR "GenerateAbiTest: ${_where}: '${_member}' is not a member name")
            endif()
        elseif(NOT _member STREQUAL "")
            message(FATAL_ERROR "GenerateAbiTest: ${_where}: a ${_kind} row names no member")
        endif()

        if(_kind STREQUAL "sizeof")
            set(_actual "(long long)sizeof(${_name})")
        elseif(_kind STREQUAL "alignof")
            set(_actual "(long long)_Alignof(${_name})")
        elseif(_kind STREQUAL "offsetof")
            set(_actual "(long long)offsetof(${_name}, ${_member})")
        elseif(_kind STREQUAL "membersize")
            set(_actual "(long long)sizeof(((${_name} *)0)->${_member})")
        elseif(_kind STREQUAL "enum")
            set(_actual "(long long)(${_name})")
        elseif(_kind STREQUAL "macro")
            set(_actual "")
        else()
            message(FATAL_ERROR "GenerateAbiTest: ${_where}: unknown kind '${_kind}'")
        endif()

        if(_kind STREQUAL "macro")
            # An absent macro is reported like any other wrong row.
            string(APPEND _rows
                "#ifdef ${_name}\n"
                "    {\"macro\", \"${_name}\", \"\", 1, (long long)(${_name}), ${_expected}},\n"
                "#else\n"
                "    {\"macro\", \"${_name}\", \"\", 0, 0, ${_expected}},\n"
                "#endif\n")
        else()
            string(APPEND _rows
                "    {\"${_kind}\", \"${_name}\", \"${_member}\", 1, ${_actual}, ${_expected}},\n")
        endif()
    endif()
    math(EXPR _rowCount "${_rowCount} + 1")
endforeach()

if(_rowCount EQUAL 0)
    message(FATAL_ERROR "GenerateAbiTest: ${KVI_ABI_TSV} has no rows")
endif()
if(_prototypes STREQUAL "")
    set(_prototypes "    /* the table lists no functions */\n")
endif()

get_filename_component(_tsvName "${KVI_ABI_TSV}" NAME)
set(_source [=[
/* Generated by cmake/GenerateAbiTest.cmake from @_tsvName@: do not edit. */
/* Checks include/SaHpi.h against every row of the table for this host. */

#include "SaHpi.h"

#include <stddef.h>
#include <stdio.h>
#include <string.h>

#if __SIZEOF_POINTER__ == 8
#define KVI_ABI_COLUMN 0
#define KVI_ABI_COLUMN_NAME "lp64"
#elif __SIZEOF_POINTER__ == 4
#define KVI_ABI_COLUMN 1
#define KVI_ABI_COLUMN_NAME "ilp32"
#else
#error "the ABI table has columns for 64-bit and 32-bit x86 only"
#endif

typedef struct {
    const char *kind;
    const char *name;
    const char *member; /* member name, or the prototype of a function */
    int present;        /* 0: the macro is not defined */
    long long actual;
    long long expected[2]; /* lp64, ilp32 */
} KviAbiRowT;

static const KviAbiRowT kviAbiRows[] = {
@_rows@};

/*
 * Each entry point converted to a pointer of its published type. With
 * -Werror a mismatch stops the build here; sizeof keeps the conversions
 * unevaluated, so the functions need no definition at link time.
 */
static void kviAbiPrototypesConvert(void)
{
@_prototypes@}

static int kviAbiRowFails(const KviAbiRowT *row)
{
    long long expected = row->expected[KVI_ABI_COLUMN];

    if (!row->present) {
        printf("FAIL macro %s: not defined, expected %lld\n", row->name, expected);
        return 1;
    }
    if (row->actual == expected) {
        return 0;
    }
    if (strcmp(row->kind, "function") == 0) {
        printf("FAIL function %s: prototype is not %s\n", row->name, row->member);
    } else if (row->member[0] != '\0') {
        printf("FAIL %s %s.%s: %lld, expected %lld\n", row->kind, row->name, row->member,
               row->actual, expected);
    } else {
        printf("FAIL %s %s: %lld, expected %lld\n", row->kind, row->name, row->actual, expected);
    }
    return 1;
}

int main(void)
{
    size_t count = sizeof kviAbiRows / sizeof kviAbiRows[0];
    size_t failed = 0;
    size_t i;

    kviAbiPrototypesConvert();
    for (i = 0; i < count; i++) {
        failed += (size_t)kviAbiRowFails(&kviAbiRows[i]);
    }
    printf("%zu of %zu rows of @_tsvName@ hold for %s\n", count - failed, count,
           KVI_ABI_COLUMN_NAME);
    return failed == 0 ? 0 : 1;
}
]=])
string(CONFIGURE "${_source}" _source @ONLY)
# Leading newline of the bracket argument.
string(REGEX REPLACE "^\n" "" _source "${_source}")

file(WRITE "${KVI_ABI_OUTPUT}" "${_source}")
