// Opened once, and kept until the program ends.

#include "kzfp/serve/http_library.hpp"

#include <string>

namespace kzfp::serve {

const HttpLibrary& http_library()
try {
    static const HttpLibrary library;
    return library;
} catch (const audio::LibraryError& error) {
    throw audio::LibraryError("libmicrohttpd cannot be opened (" + std::string(error.what()) +
                              "); install it (Debian: libmicrohttpd12)");
}

} // namespace kzfp::serve
