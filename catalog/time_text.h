// Recording times as texts: seconds since 1970 in UTC or in the
// workstation's local time, in a strftime format.
#ifndef CATALOG_TIME_TEXT_H
#define CATALOG_TIME_TEXT_H

#include <ctime>
#include <string>

enum class Zone { kUtc, kLocal };

inline std::string TimeText(std::time_t seconds, const char* format, Zone zone)
{
    std::tm tm{};
    if (zone == Zone::kUtc)
        gmtime_r(&seconds, &tm);
    else
        localtime_r(&seconds, &tm);
    char text[64];
    return std::strftime(text, sizeof text, format, &tm) > 0 ? text : "";
}

#endif
