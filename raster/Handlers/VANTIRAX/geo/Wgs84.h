// The WGS 84 ellipsoid, the one every position of the geolocation code lies on.
#pragma once

constexpr double kWgs84SemiMajorAxis = 6378137.0;  // metres
constexpr double kWgs84SemiMinorAxis = 6356752.3142;
constexpr double kWgs84EccentricitySquared =
    (kWgs84SemiMajorAxis * kWgs84SemiMajorAxis - kWgs84SemiMinorAxis * kWgs84SemiMinorAxis) /
    (kWgs84SemiMajorAxis * kWgs84SemiMajorAxis);
