#pragma once
// Calendar arithmetic on the simulation time axis: a date-time is six
// integers (year, month, day, hour, minute, second) on the proleptic
// Gregorian calendar, without time zones or leap seconds.

#include <array>
#include <string>

namespace vhd {

using DateTime = std::array<int, 6>;

// True when the six values name an existing date and time of day.
bool IsValidDateTime(const DateTime& dt);
// The date-time a number of seconds after start (fractions of a second are
// dropped, rounding towards the earlier second).
DateTime AddSeconds(const DateTime& start, double seconds);
// "YYYY-MM-DD hh:mm:ss".
std::string FormatDateTime(const DateTime& dt);

}  // namespace vhd
