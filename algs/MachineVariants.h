#pragma once
// TOLKA_MACHINE_VARIANTS: compiles a function twice, for processors with wide vectors and fused
// multiply-add and for the rest, and lets the loader pick one at start. Both give the same bits
// where every step is a single correctly rounded IEEE operation, an integer operation or a select.
// The thread sanitizer's runtime is not up yet when the loader picks a variant, and its
// instrumented picker crashes there, so that build has only the default variant. An attribute
// cannot be a function, hence the macro.

#if defined(__x86_64__) && defined(__GNUC__) && !defined(__clang__) && !defined(__SANITIZE_THREAD__)
#define TOLKA_MACHINE_VARIANTS __attribute__((target_clones("arch=x86-64-v4", "arch=x86-64-v3", "default")))
#else
#define TOLKA_MACHINE_VARIANTS
#endif
