#pragma once
// Calls of libraries that are loaded at the first of them. Most commands take a few of the libraries that the
// program stands on, and bringing one in costs more than many a command does. Such a program has a table of
// functions by their names, which is made while it is built: see cmake/LateProgram.cmake.

namespace Base {

struct LateFunction {
    char const* name;
    /// As the loader looks for it: "libssl.so.3".
    char const* library;
};

/// Where each function is that VLSERVICE_LATE_CALL has numbered, from 0.
extern LateFunction const LATE_FUNCTIONS[];

} // namespace Base

// One piece of assembly: the first of these, then the second for each function. A call is a jump through its
// place in vlservice_late_targets, which leads to the line behind it until the function is known.
// clang-format off
#define VLSERVICE_LATE_CALLS \
    ".data\n" \
    ".globl vlservice_late_targets\n" \
    ".hidden vlservice_late_targets\n" \
    ".balign 8\n" \
    "vlservice_late_targets:\n" \
    ".text\n"
#define VLSERVICE_LATE_CALL(NAME, NUMBER) \
    ".globl " NAME "\n" \
    ".hidden " NAME "\n" \
    ".type " NAME ", @function\n" \
    ".balign 16\n" \
    NAME ":\n" \
    "    jmp *vlservice_late_targets+8*" #NUMBER "(%rip)\n" \
    "1:\n" \
    "    push $" #NUMBER "\n" \
    "    jmp vlservice_late_first_call\n" \
    ".size " NAME ", .-" NAME "\n" \
    ".data\n" \
    "    .quad 1b\n" \
    ".text\n"
// clang-format on
