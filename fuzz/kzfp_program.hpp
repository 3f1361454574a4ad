/// @file
/// The whole of kzfp in this process.
#pragma once

#include <string>
#include <vector>

/// The program's own main().
int kzfp_main(int argc, char** argv);

namespace kz::fuzz {

/// Runs the program; gives its exit status.
inline int kzfp(std::vector<std::string> arguments)
{
    arguments.insert(arguments.begin(), "kzfp");
    std::vector<char*> pointers;
    for (std::string& argument : arguments) {
        pointers.push_back(argument.data());
    }
    pointers.push_back(nullptr);
    return kzfp_main(static_cast<int>(arguments.size()), pointers.data());
}

} // namespace kz::fuzz
