// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include <fcntl.h>
#include <linux/rtc.h>
#include <sys/ioctl.h>

#include <cerrno>
#include <cstdio>

/// Asks /dev/rtc for the time and prints "YEAR-MONTH-DAY HOUR:MINUTE"; the exit status is the errno of a failure.
int main()
{
    rtc_time time{};
    const int clock = ::open("/dev/rtc", O_RDWR);
    if (clock < 0 || ::ioctl(clock, RTC_RD_TIME, &time) != 0)
        return errno;
    std::printf("%d-%d-%d %d:%d\n", time.tm_year + 1900, time.tm_mon + 1, time.tm_mday, time.tm_hour, time.tm_min);
    return 0;
}
