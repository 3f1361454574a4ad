#include "fuzz.hpp"

extern "C" int LLVMFuzzerInitialize(int* /*count*/, char*** /*arguments*/)
{
    GTEST_FLAG_SET(throw_on_failure, true); // not caught: the fuzzer keeps the input
    EXPECT_EQ(KZ_OK, kzmem_initialize(0, 0));
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t count)
{
    FuzzedDataProvider choices(bytes, count);
    kz::fuzz::run(choices);
    return 0;
}
