// Elements carry classes instead of colours, which the style sets for both themes.

#include "report/svg.hpp"

#include "report/html.hpp"
#include "report/numbers.hpp"
#include "report/text.hpp"

namespace report {

namespace {

std::string attribute(std::string_view name, const std::string& value)
{
    return " " + std::string(name) + "=\"" + value + "\"";
}

std::string attributes_of(const Box& box)
{
    return attribute("x", coordinate(box.x)) + attribute("y", coordinate(box.y)) +
           attribute("width", coordinate(box.width)) + attribute("height", coordinate(box.height));
}

std::string finished(const std::string& name, const std::string& attributes,
                     std::string_view tooltip)
{
    if (tooltip.empty()) {
        return "<" + name + attributes + "/>\n";
    }
    return "<" + name + attributes + ">" + element("title", "", escaped(tooltip)) + "</" + name +
           ">\n";
}

const char* name_of(Anchor anchor)
{
    switch (anchor) {
    case Anchor::middle:
        return "middle";
    case Anchor::end:
        return "end";
    case Anchor::start:
        break;
    }
    return "start";
}

} // namespace

Svg::Svg(double width, double height, std::string_view title, std::string_view description)
    : attributes_("xmlns=\"http://www.w3.org/2000/svg\" class=\"drawing\" role=\"img\"" +
                  attribute("viewBox", "0 0 " + coordinate(width) + " " + coordinate(height))),
      paper_{0, 0, width, height}, content_(element("title", "", escaped(title)) +
                                            element("desc", "", escaped(description)) + "\n")
{
}

void Svg::rectangle(const Box& box, std::string_view style, std::string_view tooltip)
{
    content_ +=
        finished("rect", attributes_of(box) + attribute("class", std::string(style)), tooltip);
}

void Svg::line(double x1, double y1, double x2, double y2, std::string_view style)
{
    content_ += "<line" + attribute("x1", coordinate(x1)) + attribute("y1", coordinate(y1)) +
                attribute("x2", coordinate(x2)) + attribute("y2", coordinate(y2)) +
                attribute("class", std::string(style)) + "/>\n";
}

void Svg::circle(double x, double y, double radius, std::string_view style,
                 std::string_view tooltip)
{
    content_ +=
        finished("circle",
                 attribute("cx", coordinate(x)) + attribute("cy", coordinate(y)) +
                     attribute("r", coordinate(radius)) + attribute("class", std::string(style)),
                 tooltip);
}

void Svg::text(double x, double y, std::string_view words, Anchor anchor, std::string_view style)
{
    std::string attributes = "x=\"" + coordinate(x) + "\" y=\"" + coordinate(y) + "\"";
    if (anchor != Anchor::start) {
        attributes += attribute("text-anchor", name_of(anchor));
    }
    attributes += attribute("class", std::string(style));
    content_ += element("text", attributes, escaped(words)) + "\n";
}

void Svg::path(const std::string& data, std::string_view style)
{
    content_ += "<path" + attribute("d", data) + attribute("class", std::string(style)) + "/>\n";
}

void Svg::image(const Box& box, const std::string& png, std::string_view style)
{
    content_ += "<image" + attributes_of(box) + attribute("preserveAspectRatio", "none") +
                attribute("class", std::string(style)) + attribute("href", png) + "/>\n";
}

std::string Svg::finish() const { return element("svg", attributes_, "\n" + content_); }

std::string Svg::finish_file(std::string_view style) const
{
    const std::string size = attribute("width", coordinate(paper_.width)) +
                             attribute("height", coordinate(paper_.height));
    return element("svg", attributes_ + size,
                   "\n" + element("style", "", style) + "\n" +
                       finished("rect", attributes_of(paper_) + attribute("class", "paper"), {}) +
                       content_) +
           "\n";
}

std::string coordinate(double number)
{
    std::string text = number_text(number, 1);
    if (text.ends_with(".0")) {
        text.resize(text.size() - 2);
    }
    return text;
}

std::string point(double x, double y) { return coordinate(x) + "," + coordinate(y); }

} // namespace report
