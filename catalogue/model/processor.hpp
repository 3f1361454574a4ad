/// @file
/// The instruction set that inner loops are chosen for.
#pragma once

#include <span>
#include <string_view>

namespace kzcat {

/// For which inner loops may exist, a later one being faster where a processor has it. A room that
/// has no loop for one uses that of the one before it. All give the same bits.
enum class Instructions {
    plain,  ///< what every processor has
    neon,   ///< 64-bit ARM
    avx2,   ///< x86
    avx512, ///< x86 with AVX-512 F, BW and VPOPCNTDQ
};

/// Its name, as KZCAT_KERNELS has it: "plain", "neon", "avx2", "avx512".
std::string_view name_of(Instructions instructions);

/// What this processor runs, plain first and the best one last.
std::span<const Instructions> runnable_instructions();

/// The best of them, or the one that the environment variable KZCAT_KERNELS names. It is chosen
/// once; a name that does not exist or does not run here is ignored.
Instructions chosen_instructions();

} // namespace kzcat
