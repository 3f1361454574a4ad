#include "bindings/cpp/document_digest.hpp"

#include <string_view>

#include "support/digest.hpp"

namespace kz::test {

std::string document_digest(const std::string& document)
{
    return digest_of(std::string_view(document));
}

} // namespace kz::test
