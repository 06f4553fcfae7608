#include "httpfileoutputer/HttpDate.h"

#include <array>
#include <cstdio>

namespace reference {

namespace {

constexpr std::array<std::string_view, 7> kDays = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
constexpr std::array<std::string_view, 7> kLongDays = {"Sunday",   "Monday", "Tuesday", "Wednesday",
                                                       "Thursday", "Friday", "Saturday"};
constexpr std::array<std::string_view, 12> kMonths = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                      "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};

/** Takes one piece after the other from the front of a text; after the first that does not fit nothing does. */
class Pieces {
public:
    explicit Pieces(std::string_view text) : rest(text) {}

    void Skip(std::string_view expected) {
        if (rest.substr(0, expected.size()) != expected) {
            isGood = false;
            return;
        }
        rest.remove_prefix(expected.size());
    }

    /** Number of the word with which the text begins. */
    template <size_t N>
    int Word(const std::array<std::string_view, N>& words) {
        for (size_t i = 0; i < N; ++i) {
            if (rest.substr(0, words[i].size()) == words[i]) {
                rest.remove_prefix(words[i].size());
                return static_cast<int>(i);
            }
        }
        isGood = false;
        return 0;
    }

    /** A number of exactly so many digits; with `blank`, the first may be a blank. */
    int Digits(size_t count, bool blank = false) {
        int number = 0;
        for (size_t i = 0; i < count; ++i) {
            const char digit = i < rest.size() ? rest[i] : '\0';
            if (digit == ' ' && blank && i == 0) {
                continue;
            }
            if (digit < '0' || digit > '9') {
                isGood = false;
                return 0;
            }
            number = number * 10 + (digit - '0');
        }
        rest.remove_prefix(count);
        return number;
    }

    void Clock(struct tm& time) {
        time.tm_hour = Digits(2);
        Skip(":");
        time.tm_min = Digits(2);
        Skip(":");
        time.tm_sec = Digits(2);
    }

    bool AtGoodEnd() const { return isGood && rest.empty(); }

private:
    std::string_view rest;
    bool isGood = true;
};

int FullYear(int twoDigits, time_t now) {
    constexpr int kFarthestAhead = 50;
    struct tm today {};
    gmtime_r(&now, &today);
    const int thisYear = today.tm_year + 1900;
    const int year = thisYear - thisYear % 100 + twoDigits;
    if (year > thisYear + kFarthestAhead) {
        return year - 100;
    }
    return year + 100 <= thisYear + kFarthestAhead ? year + 100 : year;
}

/** The time, if it exists: `timegm` would turn 31 February into a day of March. */
std::optional<time_t> TimeOf(const struct tm& fields) {
    struct tm normal = fields;
    // A leap second is the next minute's first.
    if (fields.tm_sec > 60) {
        return std::nullopt;
    }
    normal.tm_sec = 0;
    const time_t minute = timegm(&normal);
    if (normal.tm_min != fields.tm_min || normal.tm_hour != fields.tm_hour || normal.tm_mday != fields.tm_mday) {
        return std::nullopt;
    }
    return minute + fields.tm_sec;
}

}  // namespace

std::string HttpDateText(time_t time) {
    struct tm utc {};
    if (gmtime_r(&time, &utc) == nullptr || utc.tm_year < -1900 || utc.tm_year > 9999 - 1900) {
        return "";
    }
    char text[64];
    snprintf(text, sizeof(text), "%s, %02d %s %04d %02d:%02d:%02d GMT", kDays[static_cast<size_t>(utc.tm_wday)].data(),
             utc.tm_mday, kMonths[static_cast<size_t>(utc.tm_mon)].data(), utc.tm_year + 1900, utc.tm_hour, utc.tm_min,
             utc.tm_sec);
    return text;
}

std::optional<time_t> ReadHttpDate(std::string_view text, time_t now) {
    struct tm time {};
    Pieces pieces(text);
    const size_t comma = text.find(',');
    if (comma == std::string_view::npos) {
        pieces.Word(kDays);
        pieces.Skip(" ");
        time.tm_mon = pieces.Word(kMonths);
        pieces.Skip(" ");
        time.tm_mday = pieces.Digits(2, true);
        pieces.Skip(" ");
        pieces.Clock(time);
        pieces.Skip(" ");
        time.tm_year = pieces.Digits(4) - 1900;
    } else {
        const bool isShort = comma == kDays.front().size();
        isShort ? pieces.Word(kDays) : pieces.Word(kLongDays);
        pieces.Skip(", ");
        time.tm_mday = pieces.Digits(2);
        pieces.Skip(isShort ? " " : "-");
        time.tm_mon = pieces.Word(kMonths);
        pieces.Skip(isShort ? " " : "-");
        time.tm_year = (isShort ? pieces.Digits(4) : FullYear(pieces.Digits(2), now)) - 1900;
        pieces.Skip(" ");
        pieces.Clock(time);
        pieces.Skip(" GMT");
    }
    return pieces.AtGoodEnd() ? TimeOf(time) : std::nullopt;
}

}  // namespace reference
