// Angle units of the geolocation code: its interfaces take radians, while
// zone and band rules are stated in whole degrees. Also the range check its
// angles and grid coordinates are held to.
#pragma once

constexpr double kPi = 3.14159265358979323846;
constexpr double kTwoPi = 2.0 * kPi;
constexpr double kHalfPi = kPi / 2.0;

constexpr double DegreesToRadians(double degrees) { return degrees * (kPi / 180.0); }
constexpr double RadiansToDegrees(double radians) { return radians * 180.0 / kPi; }

// Inclusive at both ends; false for NaN.
constexpr bool Within(double value, double low, double high)
{
    return value >= low && value <= high;
}

constexpr double kHalfTurnDegrees = 180.0;
constexpr double kTurnDegrees = 360.0;

// The longitude moved by a whole turn when it lies more than half a turn from
// reference: the corners of an image across the 180 degree meridian then
// keep running east of its first corner (an upper-right longitude of 189,
// not -171), while corners less than half a turn apart stay as they are.
constexpr double LongitudeNear(double longitude, double reference)
{
    if (longitude - reference > kHalfTurnDegrees)
        return longitude - kTurnDegrees;
    if (longitude - reference < -kHalfTurnDegrees)
        return longitude + kTurnDegrees;
    return longitude;
}
