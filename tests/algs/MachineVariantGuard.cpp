// Skips every test of a program built for one machine variant when this processor cannot run it.
#include <gtest/gtest.h>

#include <string_view>

namespace {

bool processorRuns(std::string_view variant) {
    if (variant == "x86-64-v3") {
        return __builtin_cpu_supports("avx2") && __builtin_cpu_supports("fma") && __builtin_cpu_supports("bmi2");
    }
    return true;
}

class MachineVariantGuard : public testing::Environment {
public:
    void SetUp() override {
        if (!processorRuns(TOLKA_MACHINE_VARIANT)) GTEST_SKIP() << "this processor cannot run " << TOLKA_MACHINE_VARIANT;
    }
};

const testing::Environment* const guard = testing::AddGlobalTestEnvironment(new MachineVariantGuard);

}  // namespace
