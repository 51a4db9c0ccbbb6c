#include "platform/Hex.h"

#include <array>
#include <cstddef>

#if defined(__x86_64__)
#include <immintrin.h>
#endif

namespace TolkaTouch::Hex {

namespace {

constexpr std::array<int8_t, 256> kHexDigits = [] {
    std::array<int8_t, 256> digits{};
    for (auto& digit : digits) digit = -1;
    for (int c = '0'; c <= '9'; ++c) digits[c] = static_cast<int8_t>(c - '0');
    for (int c = 'a'; c <= 'f'; ++c) digits[c] = static_cast<int8_t>(c - 'a' + 10);
    for (int c = 'A'; c <= 'F'; ++c) digits[c] = static_cast<int8_t>(c - 'A' + 10);
    return digits;
}();

// Two hex digits (the first in the low byte) to their byte, -1 for any other pair: one look-up
// a byte. Only the 22 x 22 digit pairs are ever read, a few kilobytes of the table.
constexpr std::array<int16_t, 65536> kHexPairs = [] {
    std::array<int16_t, 65536> pairs{};
    for (auto& pair : pairs) pair = -1;
    for (int high = 0; high < 256; ++high) {
        if (kHexDigits[high] < 0) continue;
        for (int low = 0; low < 256; ++low) {
            if (kHexDigits[low] >= 0) pairs[high | low << 8] = static_cast<int16_t>(kHexDigits[high] << 4 | kHexDigits[low]);
        }
    }
    return pairs;
}();

// `count` triples from `at` to `out`, a table look-up each; false when any is not "hh ".
bool decodeTriples(const uint8_t* at, size_t count, uint8_t* out) {
    int bad = 0;
    for (size_t i = 0; i < count; ++i, at += 3) {
        const int byte = kHexPairs[at[0] | at[1] << 8];
        bad |= byte | -static_cast<int>(at[2] != ' ');
        out[i] = static_cast<uint8_t>(byte);
    }
    return bad >= 0;
}

#if defined(__x86_64__)

// Sixteen triples (48 characters, three vectors) make sixteen bytes. Per character of a vector:
// whether it is a digit's or a space's place, and which output byte takes it as high or low
// digit (-128: none, which the shuffle turns into 0).
struct BlockLayout {
    std::array<std::array<int8_t, 16>, 3> digitPlace{};
    std::array<std::array<int8_t, 16>, 3> spacePlace{};
    std::array<std::array<int8_t, 16>, 3> highFrom{};
    std::array<std::array<int8_t, 16>, 3> lowFrom{};
};

constexpr BlockLayout kLayout = [] {
    BlockLayout layout;
    for (int vector = 0; vector < 3; ++vector) {
        for (int lane = 0; lane < 16; ++lane) {
            const int character = 16 * vector + lane;
            layout.digitPlace[vector][lane] = static_cast<int8_t>(character % 3 == 2 ? 0 : -1);
            layout.spacePlace[vector][lane] = static_cast<int8_t>(character % 3 == 2 ? -1 : 0);
            const int high = 3 * lane;
            const int low = 3 * lane + 1;
            layout.highFrom[vector][lane] = static_cast<int8_t>(high / 16 == vector ? high % 16 : -128);
            layout.lowFrom[vector][lane] = static_cast<int8_t>(low / 16 == vector ? low % 16 : -128);
        }
    }
    return layout;
}();

__m128i load(const std::array<int8_t, 16>& lanes) { return _mm_loadu_si128(reinterpret_cast<const __m128i*>(lanes.data())); }

// The byte shuffle this needs came after the baseline instruction set; the caller checks for it.
__attribute__((target("ssse3"))) bool decodeBlocks(const uint8_t* at, size_t blocks, uint8_t* out) {
    const __m128i beforeZero = _mm_set1_epi8('0' - 1);
    const __m128i afterNine = _mm_set1_epi8('9' + 1);
    const __m128i beforeA = _mm_set1_epi8('a' - 1);
    const __m128i afterF = _mm_set1_epi8('f' + 1);
    const __m128i caseBit = _mm_set1_epi8(0x20);
    const __m128i space = _mm_set1_epi8(' ');
    const __m128i zero = _mm_set1_epi8('0');
    const __m128i letterBase = _mm_set1_epi8('a' - 10);
    int bad = 0;
    for (size_t block = 0; block < blocks; ++block, at += 48, out += 16) {
        __m128i high = _mm_setzero_si128();
        __m128i low = _mm_setzero_si128();
        for (int vector = 0; vector < 3; ++vector) {
            const __m128i text = _mm_loadu_si128(reinterpret_cast<const __m128i*>(at + 16 * vector));
            // Signed compares: a character of 0x80 and above is below every bound, so no digit.
            const __m128i folded = _mm_or_si128(text, caseBit);
            const __m128i decimal = _mm_and_si128(_mm_cmpgt_epi8(text, beforeZero), _mm_cmpgt_epi8(afterNine, text));
            const __m128i letter = _mm_and_si128(_mm_cmpgt_epi8(folded, beforeA), _mm_cmpgt_epi8(afterF, folded));
            const __m128i fits = _mm_or_si128(_mm_and_si128(load(kLayout.digitPlace[vector]), _mm_or_si128(decimal, letter)),
                                              _mm_and_si128(load(kLayout.spacePlace[vector]), _mm_cmpeq_epi8(text, space)));
            bad |= _mm_movemask_epi8(fits) ^ 0xFFFF;
            const __m128i nibble = _mm_or_si128(_mm_and_si128(decimal, _mm_sub_epi8(text, zero)),
                                                _mm_andnot_si128(decimal, _mm_sub_epi8(folded, letterBase)));
            high = _mm_or_si128(high, _mm_shuffle_epi8(nibble, load(kLayout.highFrom[vector])));
            low = _mm_or_si128(low, _mm_shuffle_epi8(nibble, load(kLayout.lowFrom[vector])));
        }
        // Each high digit is below 16, so shifting the 16-bit lanes moves nothing across bytes.
        _mm_storeu_si128(reinterpret_cast<__m128i*>(out), _mm_or_si128(_mm_slli_epi16(high, 4), low));
    }
    return bad == 0;
}

bool canDecodeBlocks() {
    static const bool supported = __builtin_cpu_supports("ssse3");
    return supported;
}

#endif

}  // namespace

bool bytesFromRecordingForm(std::string_view text, std::vector<uint8_t>& bytes) {
    const auto* at = reinterpret_cast<const uint8_t*>(text.data());
    const size_t triples = text.size() / 3;
    const size_t tail = text.size() % 3;  // 2: a last pair without its separator
    if (tail == 1) return false;
    bytes.resize(triples + tail / 2);
    uint8_t* out = bytes.data();
    size_t done = 0;
#if defined(__x86_64__)
    if (canDecodeBlocks()) {
        const size_t blocks = triples / 16;
        if (!decodeBlocks(at, blocks, out)) return false;
        done = 16 * blocks;
    }
#endif
    if (!decodeTriples(at + 3 * done, triples - done, out + done)) return false;
    if (tail == 2) {
        const int byte = kHexPairs[at[3 * triples] | at[3 * triples + 1] << 8];
        if (byte < 0) return false;
        out[triples] = static_cast<uint8_t>(byte);
    }
    return true;
}

}  // namespace TolkaTouch::Hex
