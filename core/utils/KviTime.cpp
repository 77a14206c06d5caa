// Clock readings and a calendar breakdown of our own: the logger stamps every
// line with it, so it must neither log nor touch the C library's time-zone
// state.
#include "kvi/KviTime.h"

#include "core/utils/KviClock.h"
#include "core/utils/KviTrace.h"

namespace
{
constexpr SaHpiInt32T MAX_ZONE_OFFSET = 43200;
constexpr SaHpiInt64T SECONDS_PER_DAY = 86400;
constexpr int DAYS_PER_FOUR_YEARS = 1461;

// Days before each month, in common and leap years.
constexpr int MONTH_STARTS[2][12] = {
    {0, 31, 59, 90, 120, 151, 181, 212, 243, 273, 304, 334},
    {0, 31, 60, 91, 121, 152, 182, 213, 244, 274, 305, 335},
};

SaHpiInt64T floorMod(SaHpiInt64T a, SaHpiInt64T b)
{
    SaHpiInt64T r = a % b;
    return r < 0 ? r + b : r;
}

// Every fourth year from 1972 is a leap year: right from 1901 to 2099.
bool isLeapYearSince1970(int years) { return (years + 2) % 4 == 0; }

int daysBeforeYearSince1970(int years) { return years * 365 + (years + 1) / 4; }

void fillDate(SaHpiInt64T days, struct tm *out)
{
    if (days < 0) {
        // Before the epoch is out of range: the last day of 1969.
        out->tm_year = 69;
        out->tm_yday = 364;
        out->tm_mon = 11;
        out->tm_mday = 31;
        out->tm_wday = 3;
        return;
    }
    int years = static_cast<int>((4 * days + 2) / DAYS_PER_FOUR_YEARS);
    int yday = static_cast<int>(days) - daysBeforeYearSince1970(years);
    const int *starts = MONTH_STARTS[isLeapYearSince1970(years) ? 1 : 0];
    int month = 11;
    while (month > 0 && starts[month] > yday)
        --month;
    out->tm_year = years + 70;
    out->tm_yday = yday;
    out->tm_mon = month;
    out->tm_mday = yday - starts[month] + 1;
    out->tm_wday = static_cast<int>((days + 4) % 7);
}

SaErrorT kviCsTimeGetTimeNoLogging(SaHpiUint32T Seconds, SaHpiInt32T Offset, struct tm *TimeStruct)
{
    if (TimeStruct == nullptr || Offset < -MAX_ZONE_OFFSET || Offset > MAX_ZONE_OFFSET)
        return SA_ERR_HPI_INVALID_PARAMS;
    SaHpiInt64T total = static_cast<SaHpiInt64T>(Seconds) + Offset;
    SaHpiInt64T days = total >= 0 ? total / SECONDS_PER_DAY : -1;
    *TimeStruct = {};
    TimeStruct->tm_sec = static_cast<int>(floorMod(total, 60));
    TimeStruct->tm_min = static_cast<int>(floorMod(total / 60, 60));
    TimeStruct->tm_hour = static_cast<int>(floorMod(total / 3600, 24));
    fillDate(days, TimeStruct);
    TimeStruct->tm_isdst = -1;
    return SA_OK;
}

SaErrorT readClock(SaHpiUint32T *Seconds, SaHpiUint32T *MSeconds)
{
    struct timespec now;
    if (kviCsClockRead(CLOCK_REALTIME, &now) != 0)
        return SA_ERR_HPI_ERROR;
    *Seconds = static_cast<SaHpiUint32T>(now.tv_sec);
    *MSeconds = static_cast<SaHpiUint32T>(now.tv_nsec / 1000000);
    return SA_OK;
}
} // namespace

KviClockReaderT kviCsClockRead = clock_gettime;

extern "C" {

KVI_EXPORT SaErrorT kviCsGetSaHpiTime(SaHpiTimeT *Time) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Time);
    struct timespec now;
    if (kviCsClockRead(CLOCK_REALTIME, &now) != 0)
        return SA_ERR_HPI_ERROR;
    *Time = static_cast<SaHpiTimeT>(now.tv_sec) * 1000000000LL +
            static_cast<SaHpiTimeT>(now.tv_nsec / 1000000) * 1000000LL;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsGetSecondsAndMilliseconds(SaHpiUint32T *Seconds,
                                                   SaHpiUint32T *MSeconds) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Seconds);
    KVI_NULL_CHECK(MSeconds);
    return readClock(Seconds, MSeconds);
}

KVI_EXPORT SaErrorT kviCsGetSecondsAndMillisecondsNoLogging(SaHpiUint32T *Seconds,
                                                            SaHpiUint32T *MSeconds) noexcept
{
    if (Seconds == nullptr || MSeconds == nullptr)
        return SA_ERR_HPI_INVALID_PARAMS;
    return readClock(Seconds, MSeconds);
}

KVI_EXPORT SaErrorT kviCsTimeGetGmTimeNoLogging(SaHpiUint32T Seconds,
                                                struct tm *TimeStruct) noexcept
{
    return kviCsTimeGetTimeNoLogging(Seconds, 0, TimeStruct);
}

} // extern "C"

// The zone-offset form, reachable by the unit's tests.
SaErrorT kviCsTimeGetTimeNoLoggingForTest(SaHpiUint32T Seconds, SaHpiInt32T Offset,
                                          struct tm *TimeStruct) noexcept
{
    return kviCsTimeGetTimeNoLogging(Seconds, Offset, TimeStruct);
}
