#include <cstdio>

#include "kernite/Exception.h"
#include "kernite/System.h"

namespace Kernite::System {
namespace {

constexpr std::int64_t kUsPerSecond = 1000000;
constexpr std::int64_t kSecondsPerDay = 86400;
constexpr std::int64_t kUsPerDay = kSecondsPerDay * kUsPerSecond;

// Floor division, so that instants before the epoch fall on the right day.
constexpr std::int64_t FloorDiv(std::int64_t a, std::int64_t b) {
    return a / b - ((a % b != 0) && ((a < 0) != (b < 0)) ? 1 : 0);
}

bool IsLeap(std::int64_t y) { return (y % 4 == 0 && y % 100 != 0) || y % 400 == 0; }

int DaysInMonth(std::int64_t y, int m) {
    static const int kDays[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    return m == 2 && IsLeap(y) ? 29 : kDays[m - 1];
}

// Days since 1970-01-01 of a proleptic Gregorian date. Years are counted from
// March so that the leap day ends the year; eras are 400-year cycles.
std::int64_t DaysFromCivil(std::int64_t y, int m, int d) {
    y -= m <= 2 ? 1 : 0;
    const std::int64_t era = FloorDiv(y, 400);
    const std::int64_t yoe = y - era * 400;                                 // [0, 399]
    const std::int64_t doy = (153 * (m + (m > 2 ? -3 : 9)) + 2) / 5 + d - 1;  // [0, 365]
    const std::int64_t doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;         // [0, 146096]
    return era * 146097 + doe - 719468;
}

void CivilFromDays(std::int64_t days, std::int64_t& y, int& m, int& d) {
    days += 719468;
    const std::int64_t era = FloorDiv(days, 146097);
    const std::int64_t doe = days - era * 146097;
    const std::int64_t yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
    const std::int64_t doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
    const std::int64_t mp = (5 * doy + 2) / 153;
    d = static_cast<int>(doy - (153 * mp + 2) / 5 + 1);
    m = static_cast<int>(mp < 10 ? mp + 3 : mp - 9);
    y = yoe + era * 400 + (m <= 2 ? 1 : 0);
}

class Reader {
public:
    explicit Reader(const std::string& text) : _text(text) {}
    bool AtEnd() const { return _pos == _text.size(); }
    bool Peek(char c) const { return _pos < _text.size() && _text[_pos] == c; }
    bool Accept(char c) {
        if (!Peek(c)) return false;
        ++_pos;
        return true;
    }
    bool IsDigit() const { return _pos < _text.size() && _text[_pos] >= '0' && _text[_pos] <= '9'; }
    // Exactly n digits.
    bool Number(int n, int& out) {
        out = 0;
        for (int i = 0; i < n; ++i) {
            if (!IsDigit()) return false;
            out = out * 10 + (_text[_pos++] - '0');
        }
        return true;
    }
    // A fraction of a second in microseconds; digits past the sixth are dropped.
    bool Fraction(std::int64_t& us) {
        if (!IsDigit()) return false;
        us = 0;
        int digits = 0;
        while (IsDigit()) {
            if (digits < 6) {
                us = us * 10 + (_text[_pos] - '0');
                ++digits;
            }
            ++_pos;
        }
        for (; digits < 6; ++digits) us *= 10;
        return true;
    }

private:
    const std::string& _text;
    std::size_t _pos = 0;
};

[[noreturn]] void Invalid(const std::string& text) { throw InvalidArgumentException(text); }

} // namespace

DateTime DateTime::FromMicroseconds(std::int64_t sinceEpoch) noexcept {
    DateTime t;
    t._us = sinceEpoch;
    return t;
}

DateTime DateTime::Now() {
    const auto since = std::chrono::system_clock::now().time_since_epoch();
    return FromMicroseconds(std::chrono::duration_cast<std::chrono::microseconds>(since).count());
}

// YYYY-MM-DDThh:mm:ss[.f+](Z|±hh:mm|±hhmm|±hh); without a zone the time is taken as UTC.
DateTime DateTime::Parse(const std::string& text) {
    Reader in(text);
    int year, month, day, hour, minute, second;
    if (!in.Number(4, year) || !in.Accept('-') || !in.Number(2, month) || !in.Accept('-') ||
        !in.Number(2, day) || !(in.Accept('T') || in.Accept('t')) || !in.Number(2, hour) || !in.Accept(':') ||
        !in.Number(2, minute) || !in.Accept(':') || !in.Number(2, second))
        Invalid(text);
    if (month < 1 || month > 12 || day < 1 || day > DaysInMonth(year, month) || hour > 23 || minute > 59 ||
        second > 59)
        Invalid(text);
    std::int64_t fraction = 0;
    if ((in.Accept('.') || in.Accept(',')) && !in.Fraction(fraction)) Invalid(text);

    std::int64_t offsetSeconds = 0;
    const bool utc = in.Accept('Z') || in.Accept('z');
    if (!utc && (in.Peek('+') || in.Peek('-'))) {
        const int sign = in.Peek('-') ? -1 : 1;
        in.Accept(sign < 0 ? '-' : '+');
        int oh = 0, om = 0;
        if (!in.Number(2, oh)) Invalid(text);
        if (in.Accept(':')) {
            if (!in.Number(2, om)) Invalid(text);
        } else if (in.IsDigit() && !in.Number(2, om)) {
            Invalid(text);
        }
        if (oh > 23 || om > 59) Invalid(text);
        offsetSeconds = sign * (oh * 3600 + om * 60);
    }
    if (!in.AtEnd()) Invalid(text);

    const std::int64_t seconds =
        DaysFromCivil(year, month, day) * kSecondsPerDay + hour * 3600 + minute * 60 + second - offsetSeconds;
    return FromMicroseconds(seconds * kUsPerSecond + fraction);
}

std::string DateTime::ToString() const {
    const std::int64_t days = FloorDiv(_us, kUsPerDay);
    const std::int64_t inDay = _us - days * kUsPerDay;
    std::int64_t year;
    int month, day;
    CivilFromDays(days, year, month, day);
    const std::int64_t secondOfDay = inDay / kUsPerSecond;
    const std::int64_t fraction = inDay % kUsPerSecond;

    char text[64];
    int n = std::snprintf(text, sizeof text, "%04lld-%02d-%02dT%02d:%02d:%02d", static_cast<long long>(year), month,
                          day, static_cast<int>(secondOfDay / 3600), static_cast<int>(secondOfDay / 60 % 60),
                          static_cast<int>(secondOfDay % 60));
    // Milliseconds when they say it all, microseconds otherwise.
    if (fraction % 1000 == 0 && fraction != 0)
        n += std::snprintf(text + n, sizeof text - n, ".%03d", static_cast<int>(fraction / 1000));
    else if (fraction != 0)
        n += std::snprintf(text + n, sizeof text - n, ".%06d", static_cast<int>(fraction));
    std::snprintf(text + n, sizeof text - n, "Z");
    return text;
}

} // namespace Kernite::System
