#pragma once
// TOLKA_MACHINE_VARIANTS: compiles a function three times, for processors with 512-bit
// instructions, for those with 256-bit vectors and fused multiply-add, and for the rest, and lets
// the loader pick one at start. All give the same bits
// where every step is a single correctly rounded IEEE operation, an integer operation or a select.
// The thread sanitizer's runtime is not up yet when the loader picks a variant, and its
// instrumented picker crashes there, so that build has only the default variant. An attribute
// cannot be a function, hence the macro.

// A build of one variant alone (TOLKA_ONE_MACHINE_VARIANT, for the tests) compiles each function
// once, for the processor its flags name.
#if defined(__x86_64__) && defined(__GNUC__) && !defined(__clang__) && !defined(__SANITIZE_THREAD__) && \
    !defined(TOLKA_ONE_MACHINE_VARIANT)
#define TOLKA_MACHINE_VARIANTS __attribute__((target_clones("arch=x86-64-v4", "arch=x86-64-v3", "default")))
#else
#define TOLKA_MACHINE_VARIANTS
#endif
