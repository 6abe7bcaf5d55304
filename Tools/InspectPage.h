#pragma once

#include <map>
#include <string>
#include <string_view>

namespace ZeltoTouch::Tools {

// The inspect report as one self-contained HTML file: the page template with the chart
// library, the page's own script and style, and the data (InspectTrace's JSON) inside it.
std::string inspectPage(std::string_view title, std::string_view dataJSON);

// Replaces each "@NAME@" of `values` in the template in one pass (inserted text is never
// scanned again). Throws std::logic_error for a placeholder without a value.
std::string fillTemplate(std::string_view pageTemplate, const std::map<std::string, std::string_view, std::less<>>& values);

// Text made safe to sit inside an HTML element: & < > " escaped.
std::string escapeHTML(std::string_view text);

// JSON made safe to sit inside a <script> element: every "<" (which JSON can only hold inside
// strings) written as \u003c, so no "</script>" or "<!--" can end the element early.
std::string scriptSafeJSON(std::string_view json);

}  // namespace ZeltoTouch::Tools
