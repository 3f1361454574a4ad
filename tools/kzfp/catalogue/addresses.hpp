/// @file
/// Addresses of catalogues on servers, whose passwords are to be shown nowhere.
#pragma once

#include <string>

namespace kzfp {

/// Replaces passwords of addresses among the words of a command line by "***", so that whatever is
/// printed of these words shows none, and keeps the addresses for address_of(). To be called before
/// anything reads the words, by one thread.
void hide_passwords(int count, char** words);

/// What to open for a word of the command line: its address with the password, or the word itself.
/// The result is valid as long as `word`.
const std::string& address_of(const std::string& word);

} // namespace kzfp
