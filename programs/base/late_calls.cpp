#include "programs/base/late_calls.h"

#include "programs/base/error.h"

#include <atomic>
#include <cstddef>
#include <dlfcn.h>
#include <string>

#ifdef __x86_64__

extern "C" {
extern void* vlservice_late_targets[];
void* vlservice_late_function(std::size_t number);
}

// Keeps what the caller has passed in registers, and has the function come by. What is thrown meanwhile goes
// on to the caller, as if the function had thrown it.
asm(R"(
.text
.globl vlservice_late_first_call
.hidden vlservice_late_first_call
.type vlservice_late_first_call, @function
vlservice_late_first_call:
    .cfi_startproc
    .cfi_def_cfa_offset 16
    push %rdi
    push %rsi
    push %rdx
    push %rcx
    push %r8
    push %r9
    push %rax
    push %r10
    sub $128, %rsp
    .cfi_adjust_cfa_offset 192
    movups %xmm0, (%rsp)
    movups %xmm1, 16(%rsp)
    movups %xmm2, 32(%rsp)
    movups %xmm3, 48(%rsp)
    movups %xmm4, 64(%rsp)
    movups %xmm5, 80(%rsp)
    movups %xmm6, 96(%rsp)
    movups %xmm7, 112(%rsp)
    mov 192(%rsp), %rdi
    call vlservice_late_function
    mov %rax, %r11
    movups (%rsp), %xmm0
    movups 16(%rsp), %xmm1
    movups 32(%rsp), %xmm2
    movups 48(%rsp), %xmm3
    movups 64(%rsp), %xmm4
    movups 80(%rsp), %xmm5
    movups 96(%rsp), %xmm6
    movups 112(%rsp), %xmm7
    add $128, %rsp
    pop %r10
    pop %rax
    pop %r9
    pop %r8
    pop %rcx
    pop %rdx
    pop %rsi
    pop %rdi
    add $8, %rsp
    .cfi_adjust_cfa_offset -200
    jmp *%r11
    .cfi_endproc
.size vlservice_late_first_call, .-vlservice_late_first_call
)");

namespace {

[[noreturn]] void fail() {
    char const* const why = ::dlerror();
    throw Base::Error(Base::Code::ProgramLimited, "a library of the program cannot be loaded: " +
                                                      std::string(why ? why : "nobody knows why") +
                                                      "; install the package of the program again");
}

} // namespace

void* vlservice_late_function(std::size_t number) {
    Base::LateFunction const& wanted = Base::LATE_FUNCTIONS[number];
    // It stays loaded until the program ends.
    void* const library = ::dlopen(wanted.library, RTLD_LAZY | RTLD_LOCAL);
    void* const function = library ? ::dlsym(library, wanted.name) : nullptr;
    if (!function)
        fail();
    std::atomic_ref(vlservice_late_targets[number]).store(function, std::memory_order_release);
    return function;
}

#endif
