// Angle units of the geolocation code: its interfaces take radians, while
// zone and band rules are stated in whole degrees.
#pragma once

constexpr double kPi = 3.14159265358979323846;
constexpr double kTwoPi = 2.0 * kPi;
constexpr double kHalfPi = kPi / 2.0;

constexpr double DegreesToRadians(double degrees) { return degrees * (kPi / 180.0); }
constexpr double RadiansToDegrees(double radians) { return radians * 180.0 / kPi; }
