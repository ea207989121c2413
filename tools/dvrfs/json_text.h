// A text as a JSON string: quotes and backslashes escaped, control
// characters as \u00XX, everything else (UTF-8 included) as it is.
#ifndef TOOLS_DVRFS_JSON_TEXT_H
#define TOOLS_DVRFS_JSON_TEXT_H

#include <cstdio>
#include <string>

inline std::string JsonText(const std::string& text)
{
    std::string out = "\"";
    for (const unsigned char c : text) {
        if (c == '"' || c == '\\') {
            out += '\\';
            out += static_cast<char>(c);
        } else if (c < 0x20) {
            char escaped[8];
            std::snprintf(escaped, sizeof escaped, "\\u%04x", c);
            out += escaped;
        } else {
            out += static_cast<char>(c);
        }
    }
    return out + "\"";
}

#endif
