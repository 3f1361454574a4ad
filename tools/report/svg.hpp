/// @file
/// A drawing, built up from back to front. Coordinates are in the units of its view box, which are
/// pixels where there is room; y grows downwards. Texts are escaped here.
#pragma once

#include <string>
#include <string_view>

namespace report {

/// Where a text lies about its point.
enum class Anchor { start, middle, end };

struct Box {
    double x = 0;
    double y = 0;
    double width = 0;
    double height = 0;
};

class Svg {
public:
    /// `title` and `description` are what a screen reader says.
    Svg(double width, double height, std::string_view title, std::string_view description);

    void rectangle(const Box& box, std::string_view style, std::string_view tooltip = {});
    void line(double x1, double y1, double x2, double y2, std::string_view style);
    void circle(double x, double y, double radius, std::string_view style,
                std::string_view tooltip = {});
    void text(double x, double y, std::string_view words, Anchor anchor = Anchor::start,
              std::string_view style = "label");
    /// `data` is the attribute d.
    void path(const std::string& data, std::string_view style);
    /// `png` is a data: address; its pixels stay sharp.
    void image(const Box& box, const std::string& png, std::string_view style);

    /// The <svg> element.
    std::string finish() const;

    /// A file of its own with this style, on paper of the style's colour.
    std::string finish_file(std::string_view style) const;

private:
    std::string attributes_;
    Box paper_;
    std::string content_;
};

/// A coordinate with as many digits as can be seen.
std::string coordinate(double number);

/// "x,y".
std::string point(double x, double y);

} // namespace report
