#pragma once
// SeededRandom: the synthesiser's source of noise and jitter. The same seed gives the same
// numbers with every standard library: the 64-bit Mersenne twister is fixed by the language,
// and the uniform and normal draws are computed here rather than by the library's distributions.

#include <cmath>
#include <cstdint>
#include <numbers>
#include <random>

namespace TolkaTouch::Tools {

class SeededRandom {
public:
    explicit SeededRandom(uint64_t seed) : _engine(seed) {}

    // Uniform in [0, 1).
    double uniform() { return static_cast<double>(_engine() >> 11) * 0x1.0p-53; }
    double uniform(double low, double high) { return low + (high - low) * uniform(); }

    // Normal with mean 0 and the given deviation (Box-Muller, one value per draw).
    double normal(double deviation) {
        const double u1 = 1.0 - uniform();  // (0, 1]: the logarithm stays finite
        const double u2 = uniform();
        return deviation * std::sqrt(-2.0 * std::log(u1)) * std::cos(2.0 * std::numbers::pi * u2);
    }

    uint64_t next() { return _engine(); }

private:
    std::mt19937_64 _engine;
};

}  // namespace TolkaTouch::Tools
