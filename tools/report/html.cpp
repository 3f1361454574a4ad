// Pages are HTML that is well-formed XML too, so that a parser of XML can check them.

#include "report/html.hpp"

#include "report/style.hpp"
#include "report/text.hpp"

namespace report {

namespace {

/// A page may show what it holds itself, and do nothing else.
constexpr const char* kPolicy =
    R"(<meta http-equiv="Content-Security-Policy" content="default-src 'none'; img-src data:; )"
    R"(style-src 'unsafe-inline'"/>)";

std::string cell(const Column& column, const std::string& text, const char* name)
{
    return element(name, column.number ? "class=\"number\"" : "", name_element(text));
}

std::string head_of(const Table& table)
{
    std::string cells;
    for (const Column& column : table.columns) {
        cells += element("th", column.number ? "scope=\"col\" class=\"number\"" : "scope=\"col\"",
                         escaped(column.name));
    }
    return element("thead", "", element("tr", "", cells));
}

std::string rows_of(const Table& table)
{
    std::string rows;
    for (const auto& row : table.rows) {
        std::string cells;
        for (size_t i = 0; i < row.size() && i < table.columns.size(); ++i) {
            cells += cell(table.columns[i], row[i], "td");
        }
        rows += element("tr", "", cells) + "\n";
    }
    return element("tbody", "", rows);
}

/// In a box of its own, which scrolls when the window is narrower.
std::string scrolling(std::string_view name, const std::string& kind, const std::string& content)
{
    return element("div",
                   "class=\"" + kind + "\" tabindex=\"0\" role=\"region\" aria-label=\"" +
                       escaped(name) + "\"",
                   content);
}

std::string bare(const Table& table)
{
    return scrolling(table.title, "scroll", element("table", "", head_of(table) + rows_of(table)));
}

std::string head_of(const Heading& heading)
{
    return element("head", "",
                   "<meta charset=\"utf-8\"/>\n" + std::string(kPolicy) +
                       "\n<meta name=\"viewport\" content=\"width=device-width, "
                       "initial-scale=1\"/>\n<meta name=\"color-scheme\" content=\"light "
                       "dark\"/>\n" +
                       element("title", "", escaped(heading.title)) + "\n" +
                       element("style", "", "\n" + page_style()) + "\n");
}

std::string foot_of(const Heading& heading)
{
    std::string text = escaped(heading.program);
    if (!heading.made.empty()) {
        text += (text.empty() ? "" : ", ") + escaped(heading.made);
    }
    return text.empty() ? "" : element("footer", "", element("p", "", text)) + "\n";
}

} // namespace

std::string element(std::string_view name, std::string_view attributes, std::string_view content)
{
    std::string text = "<";
    text.append(name).append(attributes.empty() ? "" : " ").append(attributes).append(">");
    return text.append(content).append("</").append(name).append(">");
}

std::string name_element(std::string_view name) { return element("bdi", "", escaped(name)); }

std::string to_html(const std::vector<Fact>& facts)
{
    std::string tiles;
    for (const Fact& fact : facts) {
        tiles += element("div", "",
                         element("dt", "", escaped(fact.name)) +
                             element("dd", "", name_element(fact.value)));
    }
    return tiles.empty() ? "" : element("dl", "class=\"facts\"", tiles) + "\n";
}

std::string to_html(const Table& table)
{
    if (table.rows.empty()) {
        return element("h3", "", escaped(table.title)) + element("p", "class=\"none\"", "none") +
               "\n";
    }
    return element("h3", "", escaped(table.title)) + bare(table) + "\n";
}

std::string folded(const Table& table)
{
    if (table.rows.empty()) {
        return {};
    }
    return element("details", "", element("summary", "", escaped(table.title)) + bare(table)) +
           "\n";
}

std::string to_html(const Figure& figure)
{
    std::string text = element("h3", "", escaped(figure.title));
    if (!figure.explanation.empty()) {
        text += element("p", "class=\"explanation\"", figure.explanation);
    }
    return element("figure", "",
                   element("figcaption", "", text) + "\n" +
                       scrolling(figure.title, "plot", figure.drawing) + "\n" + figure.numbers) +
           "\n";
}

std::string notes_list(const std::vector<std::string>& notes)
{
    std::string items;
    for (const std::string& note : notes) {
        items += element("li", "", name_element(note));
    }
    return items.empty()
               ? ""
               : element("h3", "", "Notes") + element("ul", "class=\"explanation\"", items) + "\n";
}

std::string section(std::string_view title, const std::string& content)
{
    return element("section", "", element("h2", "", name_element(title)) + "\n" + content) + "\n";
}

std::string whole_page(const Heading& heading, const std::string& body)
{
    std::string top = element("h1", "", name_element(heading.title));
    if (!heading.subtitle.empty()) {
        top += element("p", "class=\"answer\"", name_element(heading.subtitle));
    }
    return "<!DOCTYPE html>\n" +
           element("html", "xmlns=\"http://www.w3.org/1999/xhtml\" lang=\"en\"",
                   "\n" + head_of(heading) + "\n" +
                       element("body", "",
                               "\n" + element("header", "", top + "\n" + to_html(heading.facts)) +
                                   "\n" + element("main", "", "\n" + body) + "\n" +
                                   foot_of(heading)) +
                       "\n") +
           "\n";
}

std::string legend_entry(std::string_view kind, std::string_view name)
{
    const std::string swatch = R"(<svg class="swatch" viewBox="0 0 12 12" aria-hidden="true">)"
                               R"(<rect width="12" height="12" class=")" +
                               std::string(kind) + "\"/></svg>";
    return element("span", "class=\"entry\"", swatch + name_element(name)) + " ";
}

} // namespace report
