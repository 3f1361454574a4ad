/// @file
/// Renders a tag tree as text, in one growing buffer that the caller receives in the end:
///
///     <R a="1">          a start tag with its attributes
///       data             data beside sub-tags, one level deeper
///       <C>x</C>         an element without sub-tags takes one line
///       <E></E>          there is no short form of an empty element
///     </R>
///
/// Two indentations inside an element with sub-tags run even after a failure and then replace its
/// status: with indentation on, a tag that cannot be written leaves malformed text and no error.
/// Names go out as they are; data and values are escaped byte by byte, without regard to encoding.
#include "kzsdk/xml/xml.h"

#include <algorithm>
#include <memory>

#include "kzsdk/abs/dyn_buf.h"
#include "kzsdk/xml/level.hpp"
#include "kzsdk/xml/open_tags.hpp"

namespace {

using kz::xml::deeper;
using kz::xml::Level;
using kz::xml::shallower;

constexpr uint32_t kInitialCapacity = 256;
constexpr uint32_t kGrowBy = 128;
constexpr const char* kDeclaration = "<?xml version=\"1.0\" encoding=\"UTF-8\" ?>";

struct DisposeBuffer {
    void operator()(kz_dyn_buf* buffer) const noexcept
    {
        static_cast<void>(kz_dyn_buf_dispose(buffer));
    }
};
using owned_buffer = std::unique_ptr<kz_dyn_buf, DisposeBuffer>;

/// What stands for a byte in data and values; null for a byte that stands for itself.
constexpr const char* entity_for(char byte) noexcept
{
    switch (byte) {
    case '<':
        return "&lt;";
    case '>':
        return "&gt;";
    case '&':
        return "&amp;";
    case '\'':
        return "&apos;";
    case '"':
        return "&quot;";
    default:
        return nullptr;
    }
}

/// Writes a tree into a buffer. Appending goes on until something fails; the status then stays, and
/// later appends do nothing, until an indentation that always runs puts its own status in the
/// place.
class Renderer {
public:
    Renderer(kz_dyn_buf& buffer, bool indent, bool newlines) noexcept
        : buffer_(buffer), indent_(indent), newlines_(newlines)
    {
    }

    /// True while nothing has failed, or after a failure was replaced.
    bool is_well() const noexcept { return status_ == KZ_OK; }

    /// The line that names version and encoding.
    void declaration() noexcept
    {
        append(kDeclaration);
        newline();
    }

    /// Writes all tags: the start of each on the way down, its end on the way back up.
    ///
    /// @return False when memory for the way back up is short. No indentation may replace that
    ///         failure: the rest of the tree could not be reached.
    bool tree(const XMLTag& root) noexcept
    {
        kz::xml::OpenTags<const XMLTag*> open;
        const XMLTag* tag = &root;
        for (Level level = 0;;) {
            start(*tag, level);
            if (is_well() && tag->sub_tags != nullptr) {
                if (!open.push(tag)) {
                    return false;
                }
                tag = tag->sub_tags;
                level = deeper(level);
                continue;
            }
            end(*tag, level);
            // A failure ends the list of sub-tags, so it climbs until an indentation forgets it.
            while (!open.is_empty() && (!is_well() || tag->next_sibling == nullptr)) {
                tag = open.top();
                open.pop();
                level = shallower(level);
                end(*tag, level);
            }
            if (open.is_empty()) {
                return true;
            }
            tag = tag->next_sibling;
        }
    }

    /// The NUL at the end is part of the buffer's data.
    void terminator() noexcept { append("", 1); }

private:
    void append(const char* bytes, uint32_t count) noexcept
    {
        if (is_well()) {
            status_ = kz_dyn_buf_append_buf(&buffer_, bytes, count);
        }
    }

    /// A null text, the name of a nameless tag, is refused by the buffer.
    void append(const char* text) noexcept
    {
        if (is_well()) {
            status_ = kz_dyn_buf_append_str(&buffer_, text);
        }
    }

    void newline() noexcept
    {
        if (newlines_) {
            append("\n");
        }
    }

    /// Two spaces a level; none for a level that has wrapped below 0.
    void indentation(Level level) noexcept
    {
        for (Level i = 0; i < level && is_well(); ++i) {
            append("  ");
        }
    }

    /// For the two indentations inside an element with sub-tags: they run whatever happened before,
    /// and replace its status.
    void indentation_after_all(Level level) noexcept
    {
        status_ = KZ_OK;
        indentation(level);
    }

    /// Data or a value, with entities for the five bytes that mark-up uses.
    void escaped(const char* text) noexcept
    {
        if (text == nullptr) {
            append(nullptr);
            return;
        }
        while (*text != '\0' && is_well()) {
            if (const char* entity = entity_for(*text); entity != nullptr) {
                append(entity);
                ++text;
            } else {
                text += plain_run(text);
            }
        }
    }

    /// Appends bytes that need no entity in one piece: no more than fit without growing, but at
    /// least one. When memory runs out, the text so ends where appending byte by byte would have
    /// ended.
    uint32_t plain_run(const char* text) noexcept
    {
        const uint32_t room = std::max(buffer_.capacity - buffer_.length, 1U);
        uint32_t count = 1;
        while (count < room && text[count] != '\0' && entity_for(text[count]) == nullptr) {
            ++count;
        }
        append(text, count);
        return count;
    }

    /// Always in double quotes; a double quote in the value is an entity, so nothing can end it.
    void attribute(const XMLAttr& attribute) noexcept
    {
        append(" ");
        append(attribute.name);
        append("=\"");
        escaped(attribute.value);
        append("\"");
    }

    /// The start tag, and the data in the place where it belongs.
    void start(const XMLTag& tag, Level level) noexcept
    {
        if (indent_) {
            indentation(level);
        }
        append("<");
        append(tag.name);
        for (const XMLAttr* next = tag.attributes; next != nullptr && is_well();
             next = next->next) {
            attribute(*next);
        }
        append(">");
        if (tag.sub_tags != nullptr) {
            newline();
            data_line(tag, level);
        } else if (tag.data != nullptr) {
            escaped(tag.data);
        }
    }

    /// Data beside sub-tags stands on a line of its own, one level deeper than its tag.
    void data_line(const XMLTag& tag, Level level) noexcept
    {
        if (tag.data == nullptr) {
            return;
        }
        if (indent_) {
            indentation_after_all(deeper(level));
        }
        escaped(tag.data);
        newline();
    }

    /// The end tag; that of an element with sub-tags is on a line of its own.
    void end(const XMLTag& tag, Level level) noexcept
    {
        if (indent_ && tag.sub_tags != nullptr) {
            indentation_after_all(level);
        }
        append("</");
        append(tag.name);
        append(">");
        newline();
    }

    kz_dyn_buf& buffer_;
    bool indent_;
    bool newlines_;
    kz_status status_ = KZ_OK;
};

} // namespace

// The text is in the buffer's own block, which is returned as it is: it may be larger than needed.
char* RenderXMLTagToStrEx(const XMLTag* tag, uint8_t header, uint8_t indent,
                          uint8_t newlines) noexcept
{
    if (tag == nullptr) {
        return nullptr;
    }
    owned_buffer buffer(kz_dyn_buf_create(kInitialCapacity, kGrowBy));
    if (!buffer) {
        return nullptr;
    }
    Renderer renderer(*buffer, indent != 0, newlines != 0);
    if (header != 0) {
        renderer.declaration();
    }
    if (!renderer.is_well() || !renderer.tree(*tag)) {
        return nullptr;
    }
    renderer.terminator();
    if (!renderer.is_well()) {
        return nullptr;
    }
    return reinterpret_cast<char*>(kz_dyn_buf_dispose_and_return_buffer(buffer.release()));
}

char* RenderXMLTagToStr(const XMLTag* tag, uint8_t header) noexcept
{
    return RenderXMLTagToStrEx(tag, header, 1, 1);
}
