// The workstation's time zone, set for one scope of a test.
#ifndef TESTS_SUPPORT_TIME_ZONE_H
#define TESTS_SUPPORT_TIME_ZONE_H

#include <cstdlib>
#include <ctime>

struct TimeZone {
    explicit TimeZone(const char* zone)
    {
        ::setenv("TZ", zone, 1);
        ::tzset();
    }
    ~TimeZone()
    {
        ::unsetenv("TZ");
        ::tzset();
    }
};

#endif
