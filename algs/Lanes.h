#pragma once
// Lanes: eight floats or eight 32-bit integers worked on as one value, the unit of the
// recognizer's per-frame steps, with loads, stores, look-ups across lanes and the selects that
// mirror std::max/std::min bit for bit.
// Written in the compiler's vector types, so that each machine variant of a function turns one
// operation into one instruction of its width (two of the narrower ones on a baseline processor);
// every operation still rounds as the scalar one does.

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace TolkaTouch::Lanes {

inline constexpr size_t kWidth = 8;

using Floats = float __attribute__((vector_size(32)));
using Ints = int32_t __attribute__((vector_size(32)));
// A comparison's result: every bit set in a lane where it holds, none where it does not.
using Mask = Ints;

template <typename V>
inline V load(const void* from) {
    V v;
    std::memcpy(&v, from, sizeof v);
    return v;
}

template <typename V>
inline void store(void* to, V v) {
    std::memcpy(to, &v, sizeof v);
}

// Lane i of the result is lane index[i] of the sixteen lanes of low then high (index 0 to 15).
template <typename V>
inline V lookUp(V low, V high, Ints index) {
#if defined(__clang__)
    // This compiler has no shuffle by lanes known only when the program runs; a look-up lane by
    // lane (only the fuzzing build takes it).
    V out;
    for (size_t j = 0; j < kWidth; ++j) out[j] = (index[j] & 8) != 0 ? high[index[j] & 7] : low[index[j] & 7];
    return out;
#else
    return __builtin_shuffle(low, high, index);
#endif
}

// Lane 0 copied into every lane (adding x to zeros would turn -0.0 into 0.0).
inline Floats broadcast(float x) { return lookUp(Floats{x}, Floats{}, Ints{}); }
inline Ints broadcast(int32_t x) { return lookUp(Ints{x}, Ints{}, Ints{}); }

inline Floats toFloats(Ints v) { return __builtin_convertvector(v, Floats); }
// Truncation toward zero of lanes that are inside the 32-bit range.
inline Ints toInts(Floats v) { return __builtin_convertvector(v, Ints); }

// Eight 16-bit or 32-bit integers from memory as 32-bit lanes.
inline Ints widen(const int16_t* from) {
    using Shorts = int16_t __attribute__((vector_size(16)));
    return __builtin_convertvector(load<Shorts>(from), Ints);
}
inline Ints widen(const int32_t* from) { return load<Ints>(from); }

// Lanes moved down by Shift places (lane i takes lane i + Shift), zeros coming in at the top.
template <int Shift>
inline Ints shiftDown(Ints v) {
    static_assert(Shift >= 0 && Shift <= static_cast<int>(kWidth));
    constexpr Ints kFrom{Shift, Shift + 1, Shift + 2, Shift + 3, Shift + 4, Shift + 5, Shift + 6, Shift + 7};
    return lookUp(v, Ints{}, kFrom);
}

// The mask as eight bits, lane i at bit i.
inline uint32_t bits(Mask m) {
#if defined(__x86_64__) && defined(__GNUC__)
    // Each half's sign bits in one instruction of the processor's baseline.
    using Half = float __attribute__((vector_size(16)));
    Half low;
    Half high;
    std::memcpy(&low, &m, sizeof low);
    std::memcpy(&high, reinterpret_cast<const char*>(&m) + sizeof low, sizeof high);
    return static_cast<uint32_t>(__builtin_ia32_movmskps(low)) |
           (static_cast<uint32_t>(__builtin_ia32_movmskps(high)) << 4);
#else
    uint32_t b = 0;
    for (size_t j = 0; j < kWidth; ++j) b |= (static_cast<uint32_t>(m[j]) >> 31) << j;
    return b;
#endif
}

// 1 where the mask holds, else 0: the flags' form in a pixel row.
inline Ints flag(Mask m) { return m & 1; }

inline Floats select(Mask m, Floats a, Floats b) { return m ? a : b; }
inline Ints select(Mask m, Ints a, Ints b) { return m ? a : b; }

// std::max(a, b) and std::min(a, b) lane by lane: a unless b is strictly beyond it, so that a
// not-a-number in either place comes out where std::max and std::min put it.
inline Floats maxOf(Floats a, Floats b) { return select(a < b, b, a); }
inline Floats minOf(Floats a, Floats b) { return select(b < a, b, a); }

// The largest lane, for lanes that hold no not-a-number, in three steps of halving.
inline float largest(Floats v) {
    v = maxOf(v, lookUp(v, v, Ints{4, 5, 6, 7, 0, 1, 2, 3}));
    v = maxOf(v, lookUp(v, v, Ints{2, 3, 0, 1, 6, 7, 4, 5}));
    v = maxOf(v, lookUp(v, v, Ints{1, 0, 3, 2, 5, 4, 7, 6}));
    return v[0];
}

// The smallest lane.
inline int32_t smallest(Ints v) {
    const auto lesser = [](Ints a, Ints b) { return select(b < a, b, a); };
    v = lesser(v, lookUp(v, v, Ints{4, 5, 6, 7, 0, 1, 2, 3}));
    v = lesser(v, lookUp(v, v, Ints{2, 3, 0, 1, 6, 7, 4, 5}));
    v = lesser(v, lookUp(v, v, Ints{1, 0, 3, 2, 5, 4, 7, 6}));
    return v[0];
}

}  // namespace TolkaTouch::Lanes
