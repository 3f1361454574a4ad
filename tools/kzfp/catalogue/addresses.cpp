// A word may be an address, or an option with one behind its equals sign.

#include "kzfp/catalogue/addresses.hpp"

#include <deque>
#include <map>

#include "kzfp/catalogue/handles.hpp"

namespace kzfp {

namespace {

std::map<std::string, std::string>& addresses()
{
    static std::map<std::string, std::string> kept; ///< by what is shown of them
    return kept;
}

std::string shown(const std::string& address)
{
    uint64_t size = 0;
    check(kzcat_show_path(address.c_str(), nullptr, 0, &size));
    std::string text(size, '\0');
    check(kzcat_show_path(address.c_str(), text.data(), size, &size));
    text.pop_back(); // its NUL
    return text;
}

/// Where in a word an address begins; npos when it has none.
size_t place_of_address(const std::string& word)
{
    if (kzcat_is_server_address(word.c_str()) == 1) {
        return 0;
    }
    const size_t equals = word.find('=');
    const bool has_value = word.starts_with("--") && equals != std::string::npos;
    return has_value && kzcat_is_server_address(word.c_str() + equals + 1) == 1 ? equals + 1
                                                                                : std::string::npos;
}

} // namespace

void hide_passwords(int count, char** words)
{
    static std::deque<std::string> replaced; // words that argv refers to
    for (int i = 0; i < count; ++i) {
        const std::string word = words[i];
        const size_t place = place_of_address(word);
        if (place != std::string::npos) {
            const std::string address = word.substr(place);
            const std::string text = shown(address);
            addresses()[text] = address;
            replaced.push_back(word.substr(0, place) + text);
            words[i] = replaced.back().data();
        }
    }
}

const std::string& address_of(const std::string& word)
{
    const auto found = addresses().find(word);
    return found == addresses().end() ? word : found->second;
}

} // namespace kzfp
