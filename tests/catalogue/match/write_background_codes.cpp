// Prints catalogue/match/background_codes.cpp. Built on demand only: the codes must not change.

#include <cinttypes>
#include <cstdio>

#include "background_music.hpp"

int main()
{
    std::puts("/// @file\n"
              "/// Codes of synthetic music, eight pieces of 512: written by "
              "write_background_codes, with\n"
              "/// the music of tests/catalogue/match/background_music.cpp. They never change.\n"
              "\n"
              "#include \"catalogue/match/population.hpp\"\n"
              "\n"
              "namespace kzcat {\n"
              "namespace {\n"
              "\n"
              "// clang-format off\n"
              "constexpr Code kBackgroundCodes[] = {");
    const auto codes = kzcat::test::make_background_codes();
    for (size_t i = 0; i < codes.size(); ++i) {
        std::printf("%s0x%016" PRIx64 ",%s", i % 4 == 0 ? "    " : " ", codes[i],
                    i % 4 == 3 ? "\n" : "");
    }
    std::puts("};\n"
              "// clang-format on\n"
              "\n"
              "} // namespace\n"
              "\n"
              "std::span<const Code> background_codes() { return kBackgroundCodes; }\n"
              "\n"
              "} // namespace kzcat");
    return 0;
}
