/// @file
/// The query document as a tree of elements: what it should hold, and a reader for its text.
#pragma once

#include <cctype>
#include <cstdint>
#include <optional>
#include <span>
#include <sstream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace kz::model {

struct Element {
    std::string name;
    std::vector<std::pair<std::string, std::string>> attributes;
    std::string text;
    std::vector<Element> children;
    bool operator==(const Element&) const = default;
};

/// The values are printed unsigned although the type says signed.
inline Element query_document(std::span<const int16_t> values)
{
    std::ostringstream numbers;
    for (size_t i = 0; i < values.size(); ++i) {
        numbers << (i == 0 ? "" : " ") << static_cast<uint16_t>(values[i]);
    }
    const Element block{"FP_BLOCK",
                        {{"TYPE", "SIGNED_INT_16"},
                         {"COUNT", std::to_string(values.size())},
                         {"ENCODING", "ASCII"},
                         {"SEPARATOR", " "}},
                        numbers.str(),
                        {}};
    const Element algorithm{"ALGORITHM",
                            {},
                            "",
                            {{"NAME", {}, "Quenvar", {}},
                             {"VERSION", {}, "1.1", {}},
                             {"QUERY", {}, "Quenvar\"1.1", {}}}};
    return {
        "KZFPX_FP_QUERY", {{"VERSION", "1.0"}}, "", {algorithm, {"FP_BLOCKS", {}, "", {block}}}};
}

/// Reads just as much of XML as the document uses; throws std::runtime_error for anything else.
/// Text that is only white space counts as none.
class DocumentReader {
public:
    static Element read(std::string_view text)
    {
        DocumentReader reader(text);
        reader.expect("<?xml");
        reader.until("?>");
        reader.skip_space();
        reader.expect("<");
        Element root = reader.element();
        reader.skip_space();
        if (!reader.rest_.empty()) {
            throw std::runtime_error("text behind the root element");
        }
        return root;
    }

private:
    explicit DocumentReader(std::string_view text) : rest_(text) {}

    bool accept(std::string_view token)
    {
        const bool met = rest_.starts_with(token);
        rest_.remove_prefix(met ? token.size() : 0);
        return met;
    }

    void expect(std::string_view token)
    {
        if (!accept(token)) {
            throw std::runtime_error("expected " + std::string(token) + " before " +
                                     std::string(rest_.substr(0, 20)));
        }
    }

    std::string_view until(std::string_view token)
    {
        const size_t length = rest_.find(token);
        if (length == std::string_view::npos) {
            throw std::runtime_error("missing " + std::string(token));
        }
        const std::string_view before = rest_.substr(0, length);
        rest_.remove_prefix(length + token.size());
        return before;
    }

    static bool is_space(char c) { return std::isspace(static_cast<unsigned char>(c)) != 0; }

    bool skip_space()
    {
        const size_t before = rest_.size();
        while (!rest_.empty() && is_space(rest_.front())) {
            rest_.remove_prefix(1);
        }
        return rest_.size() < before;
    }

    std::string name()
    {
        const size_t length = rest_.find_first_of(" \t\r\n=/>");
        const std::string result(rest_.substr(0, length));
        rest_.remove_prefix(result.size());
        return result;
    }

    static std::string unescaped(std::string_view text)
    {
        static constexpr std::pair<std::string_view, char> kEntities[] = {
            {"&quot;", '"'}, {"&apos;", '\''}, {"&lt;", '<'}, {"&gt;", '>'}, {"&amp;", '&'}};
        std::string result;
        while (!text.empty()) {
            char next = text.front();
            size_t length = 1;
            for (const auto& [entity, meaning] : kEntities) {
                if (text.starts_with(entity)) {
                    next = meaning;
                    length = entity.size();
                }
            }
            if (next == '<' && length == 1) {
                throw std::runtime_error("bare < in text");
            }
            result += next;
            text.remove_prefix(length);
        }
        return result;
    }

    /// Behind the "<".
    Element element()
    {
        Element result{name(), {}, "", {}};
        while (skip_space() && !rest_.starts_with(">") && !rest_.starts_with("/>")) {
            std::string key = name();
            expect("=\"");
            result.attributes.emplace_back(std::move(key), unescaped(until("\"")));
        }
        if (accept("/>")) {
            return result;
        }
        expect(">");
        for (;;) {
            result.text += unescaped(until("<"));
            if (accept("/")) {
                break;
            }
            result.children.push_back(element());
        }
        expect(result.name);
        skip_space();
        expect(">");
        if (result.text.find_first_not_of(" \t\r\n") == std::string::npos) {
            result.text.clear();
        }
        return result;
    }

    std::string_view rest_;
};

/// The numbers of the one block of a document, read as signed words.
inline std::vector<int16_t> block_values(const Element& root)
{
    std::istringstream numbers(root.children.at(1).children.at(0).text);
    std::vector<int16_t> values;
    for (uint32_t value = 0; numbers >> value;) {
        values.push_back(static_cast<int16_t>(static_cast<uint16_t>(value)));
    }
    return values;
}

} // namespace kz::model
