#include "program/reports/html_text.h"

#include "program/reports/terminal_text.h"

namespace ipmisel {

std::string HtmlText(std::string_view text) {
    std::string out;
    for (const char c : TerminalText(text)) {
        switch (c) {
            case '&':
                out += "&amp;";
                break;
            case '<':
                out += "&lt;";
                break;
            case '>':
                out += "&gt;";
                break;
            case '"':
                out += "&quot;";
                break;
            default:
                out += c;
        }
    }
    return out;
}

}  // namespace ipmisel
