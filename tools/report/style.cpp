// Two series, blue and orange, that people who confuse red and green can tell apart; both have a
// contrast of at least 3 to 1 with what is behind them. Text is never in a series' colour.

#include "report/style.hpp"

namespace report {

namespace {

constexpr const char* kLight =
    "--paper:#fcfcfb;--raised:#f1f1ee;--ink:#1b1b19;--soft:#5c5b57;--grid:#dddcd7;"
    "--one:#1f66c1;--two:#b94f0a;--other:#73726d;--mark:#1b1b19;--image:none;";
constexpr const char* kDark =
    "--paper:#191918;--raised:#252523;--ink:#f3f2ee;--soft:#b4b3ad;--grid:#3c3c39;"
    "--one:#6da8f5;--two:#f0935a;--other:#85847e;--mark:#f3f2ee;"
    "--image:invert(1) hue-rotate(180deg);";

// The classes of drawings.
constexpr const char* kDrawing =
    R"(text{font-family:system-ui,-apple-system,"Segoe UI","DejaVu Sans",sans-serif;font-size:13px}
.paper{fill:var(--paper)}
.label{fill:var(--ink)}
.tick{fill:var(--soft);font-size:12px}
.strong{fill:var(--ink);font-weight:600}
.inside{fill:var(--paper);font-size:12px}
.one{fill:var(--one)}
.two{fill:var(--two)}
.other{fill:var(--other)}
.empty{fill:var(--raised);stroke:var(--grid);stroke-width:1}
.hole{fill:var(--paper);stroke:var(--soft);stroke-width:1;stroke-dasharray:3 3}
.line-one,.line-two,.line-other{fill:none;stroke:var(--one);stroke-width:2}
.line-one,.line-two,.line-other{stroke-linejoin:round;stroke-linecap:round}
.line-two{stroke:var(--two)}
.line-other{stroke:var(--other)}
.area-one{fill:var(--one);opacity:.14}
.grid{stroke:var(--grid);stroke-width:1}
.axis{stroke:var(--soft);stroke-width:1}
.mark{stroke:var(--mark);stroke-width:1.5;fill:none}
.dashed{stroke:var(--soft);stroke-width:1.5;stroke-dasharray:5 4;fill:none}
.picture{image-rendering:pixelated;filter:var(--image)}
.smooth{filter:var(--image)}
)";

// What surrounds them. The second part is for printing.
constexpr const char* kPage =
    R"(*{box-sizing:border-box}
html{-webkit-text-size-adjust:100%;text-size-adjust:100%}
body{margin:0 auto;max-width:1080px;padding:32px 24px;background:var(--paper)}
body{color:var(--ink);font:16px/1.5 system-ui,-apple-system,"Segoe UI","DejaVu Sans",sans-serif}
h1,h2,h3,p,li,dd,summary,.entry{overflow-wrap:anywhere}
h1{font-size:26px;line-height:1.25;margin:0 0 8px}
h2{font-size:20px;line-height:1.3;margin:0 0 8px}
h3{font-size:16px;margin:24px 0 4px}
p{margin:0 0 12px}
.answer{font-size:18px}
.explanation,.none,footer{color:var(--soft);font-size:14px}
header{margin-bottom:32px}
section{margin:40px 0 0;padding-top:24px;border-top:1px solid var(--grid)}
figure{margin:0 0 24px}
.facts{display:grid;grid-template-columns:repeat(auto-fit,minmax(140px,1fr));gap:12px;margin:16px 0}
.facts div{background:var(--raised);border-radius:8px;padding:10px 14px;min-width:0}
dt{color:var(--soft);font-size:13px}
dd{margin:0;font-size:18px;font-weight:600}
.plot,.scroll{overflow-x:auto;max-width:100%}
.plot:focus-visible,.scroll:focus-visible,
summary:focus-visible{outline:2px solid var(--one);outline-offset:2px}
.drawing{display:block;width:100%;min-width:760px;height:auto}
.swatch{width:12px;height:12px;margin-right:6px;vertical-align:-1px}
.entry{margin-right:16px}
table{border-collapse:collapse;font-size:14px;min-width:50%}
th,td{text-align:left;vertical-align:top;padding:5px 16px 5px 0;border-bottom:1px solid var(--grid)}
td{overflow-wrap:anywhere;min-width:9em;max-width:32em}
th{color:var(--soft);font-weight:600;vertical-align:bottom}
td.number{white-space:nowrap}
.number{text-align:right;min-width:0;font-variant-numeric:tabular-nums}
summary{cursor:pointer;color:var(--soft);font-size:14px;padding:6px 0}
footer{margin-top:48px;border-top:1px solid var(--grid);padding-top:12px}
@media (max-width:600px){body{padding:20px 16px}h1{font-size:22px}.answer{font-size:16px}}
@media print{body{max-width:none;padding:0;font-size:11pt}.plot,.scroll{overflow:visible}
.drawing{min-width:0}figure,tr{break-inside:avoid}
details::details-content{content-visibility:visible;display:block}}
)";

} // namespace

std::string page_style()
{
    std::string style = ":root{color-scheme:light dark;";
    style.append(kLight).append("}\n@media (prefers-color-scheme:dark){:root{");
    style.append(kDark).append("}}\n@media print{:root{").append(kLight).append("}}\n");
    return style.append(kDrawing).append(kPage);
}

std::string drawing_style()
{
    std::string style = "svg{";
    style.append(kLight).append("}\n@media (prefers-color-scheme:dark){svg{");
    return style.append(kDark).append("}}\n").append(kDrawing);
}

} // namespace report
