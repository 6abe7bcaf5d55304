#include "Tools/InspectPage.h"

#include <stdexcept>

#include "Tools/InspectAssets.h"

namespace ZeltoTouch::Tools {

std::string escapeHTML(std::string_view text) {
    std::string escaped;
    escaped.reserve(text.size());
    for (const char c : text) {
        switch (c) {
            case '&': escaped += "&amp;"; break;
            case '<': escaped += "&lt;"; break;
            case '>': escaped += "&gt;"; break;
            case '"': escaped += "&quot;"; break;
            default: escaped += c;
        }
    }
    return escaped;
}

std::string scriptSafeJSON(std::string_view json) {
    std::string safe;
    safe.reserve(json.size());
    for (const char c : json) {
        if (c == '<') {
            safe += "\\u003c";
        } else {
            safe += c;
        }
    }
    return safe;
}

std::string fillTemplate(std::string_view pageTemplate,
                         const std::map<std::string, std::string_view, std::less<>>& values) {
    std::string page;
    size_t position = 0;
    for (;;) {
        const size_t open = pageTemplate.find('@', position);
        const size_t close = open == std::string_view::npos ? open : pageTemplate.find('@', open + 1);
        if (close == std::string_view::npos) break;
        const std::string_view name = pageTemplate.substr(open + 1, close - open - 1);
        const bool isPlaceholder = !name.empty() && name.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZ_") == std::string_view::npos;
        if (!isPlaceholder) {  // an "@" of the page itself
            page.append(pageTemplate.substr(position, close - position));
            position = close;
            continue;
        }
        const auto value = values.find(name);
        if (value == values.end()) throw std::logic_error("inspect page template: no value for @" + std::string(name) + "@");
        page.append(pageTemplate.substr(position, open - position));
        page.append(value->second);
        position = close + 1;
    }
    page.append(pageTemplate.substr(position));
    return page;
}

std::string inspectPage(std::string_view title, std::string_view dataJSON) {
    const std::string escapedTitle = escapeHTML(title);
    const std::string data = scriptSafeJSON(dataJSON);
    return fillTemplate(InspectAssets::pageTemplate, {
                                                         {"TITLE", escapedTitle},
                                                         {"DYGRAPHS_STYLE", InspectAssets::dygraphsStyle},
                                                         {"PAGE_STYLE", InspectAssets::pageStyle},
                                                         {"DATA", data},
                                                         {"DYGRAPHS_SCRIPT", InspectAssets::dygraphsScript},
                                                         {"PAGE_SCRIPT", InspectAssets::pageScript},
                                                     });
}

}  // namespace ZeltoTouch::Tools
