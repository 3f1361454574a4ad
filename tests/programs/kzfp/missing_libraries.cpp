// Loaded before a program's own libraries, it plays a machine on which some libraries are not
// installed: those whose names begin with the text in MISSING_LIBRARIES.

#include <cstdlib>
#include <cstring>

#include <dlfcn.h>

/// In the place of the loader's own.
extern "C" void* dlopen(const char* name, int mode) noexcept
{
    const char* const missing = std::getenv("MISSING_LIBRARIES");
    const bool is_missing = name != nullptr && missing != nullptr &&
                            std::strncmp(name, missing, std::strlen(missing)) == 0;
    using Open = void*(const char*, int);
    auto* const open = reinterpret_cast<Open*>(::dlsym(RTLD_NEXT, "dlopen"));
    return open(is_missing ? "libnone-of-this-name.so" : name, mode);
}
