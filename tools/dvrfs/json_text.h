// Texts as the dvrfs command prints them. A path is bytes: a name copied
// from an older system may hold bytes that are not UTF-8, which are printed
// as \xNN so that every output stays readable text; a JSON string also has
// its quotes, backslashes and control characters escaped.
#ifndef TOOLS_DVRFS_JSON_TEXT_H
#define TOOLS_DVRFS_JSON_TEXT_H

#include <cstddef>
#include <cstdio>
#include <string>

// The length of the well-formed UTF-8 sequence at text[at], or 0 when the
// byte there starts none.
inline std::size_t Utf8SequenceLength(const std::string& text, std::size_t at)
{
    const unsigned char lead = static_cast<unsigned char>(text[at]);
    std::size_t length = 0;
    unsigned char low = 0x80;
    unsigned char high = 0xBF;
    if (lead < 0x80)
        return 1;
    if (lead >= 0xC2 && lead <= 0xDF)
        length = 2;
    else if (lead >= 0xE0 && lead <= 0xEF) {
        length = 3;
        low = lead == 0xE0 ? 0xA0 : 0x80;   // no overlong form
        high = lead == 0xED ? 0x9F : 0xBF;  // no surrogate
    } else if (lead >= 0xF0 && lead <= 0xF4) {
        length = 4;
        low = lead == 0xF0 ? 0x90 : 0x80;
        high = lead == 0xF4 ? 0x8F : 0xBF;  // nothing above U+10FFFF
    } else {
        return 0;
    }
    if (at + length > text.size())
        return 0;
    for (std::size_t k = 1; k < length; ++k) {
        const unsigned char next = static_cast<unsigned char>(text[at + k]);
        if (next < (k == 1 ? low : 0x80) || next > (k == 1 ? high : 0xBF))
            return 0;
    }
    return length;
}

// `name` with each byte that is not part of UTF-8 written as \xNN.
inline std::string PrintableName(const std::string& name)
{
    std::string out;
    for (std::size_t at = 0; at < name.size();) {
        const std::size_t length = Utf8SequenceLength(name, at);
        if (length == 0) {
            char escaped[5];
            std::snprintf(escaped, sizeof escaped, "\\x%02x", static_cast<unsigned char>(name[at]));
            out += escaped;
            ++at;
        } else {
            out.append(name, at, length);
            at += length;
        }
    }
    return out;
}

inline std::string JsonText(const std::string& text)
{
    std::string out = "\"";
    for (const unsigned char c : PrintableName(text)) {
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
