#include "geo/Utm.h"

#include "geo/Angles.h"
#include "geo/TransverseMercator.h"

#include <cmath>

namespace {

constexpr double kScaleFactor = 0.9996;
constexpr double kFalseEasting = 500000.0;
constexpr double kSouthFalseNorthing = 10000000.0;
constexpr double kMinEasting = 100000.0;
constexpr double kMaxEasting = 900000.0;
constexpr double kMinNorthing = 0.0;
constexpr double kMaxNorthing = 10000000.0;
// -80.5 and 84.5 degrees; compared inclusively as these exact radian values.
constexpr double kMinLatitude = -1.4049900478554351;
constexpr double kMaxLatitude = 1.4748032179352084;
// Offset of the central meridian in the grid-to-geodetic direction only.
constexpr double kInverseMeridianOffset = 5.0e-8;
constexpr int32_t kZonesPerHemisphereSide = 30;

// Central meridian of a zone in degrees, kept within 3 to 357 east.
double CentralMeridianDegrees(int32_t zone)
{
    return zone > kZonesPerHemisphereSide ? 6.0 * zone - 183.0 : 6.0 * zone + 177.0;
}

// The zone of a longitude in [0, 2 pi] on the regular 6-degree grid.
int32_t RegularZone(double longitude)
{
    const double degrees = RadiansToDegrees(longitude);
    const int32_t zone = longitude < kPi ? static_cast<int32_t>(degrees / 6.0 + 31.0)
                                         : static_cast<int32_t>(degrees / 6.0 - 29.0);
    return zone > kUtmLastZone ? kUtmFirstZone : zone;
}

// Southern Norway and Svalbard use wider or shifted zones; whole degrees of
// latitude and of longitude east of Greenwich decide.
int32_t ExceptionalZone(int32_t zone, int32_t latitudeDegrees, int32_t longitudeDegrees)
{
    if (latitudeDegrees >= 56 && latitudeDegrees <= 63) {
        if (longitudeDegrees >= 0 && longitudeDegrees <= 2)
            return 31;
        if (longitudeDegrees >= 3 && longitudeDegrees <= 11)
            return 32;
    }
    if (latitudeDegrees >= 72) {
        if (longitudeDegrees >= 0 && longitudeDegrees <= 8)
            return 31;
        if (longitudeDegrees >= 9 && longitudeDegrees <= 20)
            return 33;
        if (longitudeDegrees >= 21 && longitudeDegrees <= 32)
            return 35;
        if (longitudeDegrees >= 33 && longitudeDegrees <= 41)
            return 37;
    }
    return zone;
}

// Applies a requested zone: a neighbour of the natural zone, across the
// 60/1 seam too. Returns false when the request is not allowed.
bool ApplyRequestedZone(int32_t requestedZone, int32_t& zone)
{
    if (requestedZone == kUtmNoRequestedZone)
        return true;
    if (requestedZone < kUtmFirstZone || requestedZone > kUtmLastZone)
        return false;
    const bool acrossSeam = (zone == kUtmFirstZone && requestedZone == kUtmLastZone)
                         || (zone == kUtmLastZone && requestedZone == kUtmFirstZone);
    if (!acrossSeam && (requestedZone < zone - 1 || requestedZone > zone + 1))
        return false;
    zone = requestedZone;
    return true;
}

} // namespace

uint32_t GeodeticToUtm(double latitude, double longitude, double a, double b,
                       int32_t requestedZone, int32_t& zone, char& hemisphere,
                       double& easting, double& northing)
{
    uint32_t status = 0;
    if (!Within(latitude, kMinLatitude, kMaxLatitude))
        status |= kUtmLatitudeError;
    if (!Within(longitude, -kPi, kTwoPi))
        status |= kUtmLongitudeError;
    if (status != 0)
        return status;

    if (longitude < 0.0)
        longitude += kTwoPi;
    const int32_t longitudeDegrees = static_cast<int32_t>(RadiansToDegrees(longitude));
    const int32_t latitudeDegrees = static_cast<int32_t>(RadiansToDegrees(latitude));
    int32_t pointZone =
        ExceptionalZone(RegularZone(longitude), latitudeDegrees, longitudeDegrees);
    if (!ApplyRequestedZone(requestedZone, pointZone))
        return kUtmZoneOverrideError;

    const bool south = latitude < 0.0;
    zone = pointZone;
    hemisphere = south ? 'S' : 'N';

    TransverseMercatorParams params;
    SetTransverseMercatorParams(params, a, b, 0.0,
                                DegreesToRadians(CentralMeridianDegrees(pointZone)),
                                kFalseEasting, south ? kSouthFalseNorthing : 0.0, kScaleFactor);
    double gridEasting = 0.0;
    double gridNorthing = 0.0;
    TransverseMercatorForward(params, latitude, longitude, gridEasting, gridNorthing);

    if (!Within(gridEasting, kMinEasting, kMaxEasting))
        status |= kUtmEastingError;
    if (!Within(gridNorthing, kMinNorthing, kMaxNorthing))
        status |= kUtmNorthingError;
    easting = gridEasting;
    northing = gridNorthing;
    return status;
}

uint32_t UtmToGeodetic(int32_t zone, char hemisphere, double easting, double northing,
                       double a, double b, double& latitude, double& longitude)
{
    uint32_t status = 0;
    if (zone < kUtmFirstZone || zone > kUtmLastZone)
        status |= kUtmZoneError;
    if (hemisphere != 'N' && hemisphere != 'S')
        status |= kUtmHemisphereError;
    if (!Within(easting, kMinEasting, kMaxEasting))
        status |= kUtmEastingError;
    if (!Within(northing, kMinNorthing, kMaxNorthing))
        status |= kUtmNorthingError;
    if (status != 0)
        return status;

    const double centralMeridian =
        DegreesToRadians(CentralMeridianDegrees(zone)) + kInverseMeridianOffset;
    TransverseMercatorParams params;
    SetTransverseMercatorParams(params, a, b, 0.0, centralMeridian, kFalseEasting,
                                hemisphere == 'S' ? kSouthFalseNorthing : 0.0, kScaleFactor);
    double gridLatitude = 0.0;
    double gridLongitude = 0.0;
    if (TransverseMercatorInverse(params, easting, northing, gridLatitude, gridLongitude) != 0)
        status |= kUtmNorthingError;
    if (!Within(gridLatitude, kMinLatitude, kMaxLatitude))
        status |= kUtmNorthingError;
    latitude = gridLatitude;
    longitude = gridLongitude;
    return status;
}
