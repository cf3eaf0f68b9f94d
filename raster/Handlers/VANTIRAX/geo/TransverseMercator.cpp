#include "geo/TransverseMercator.h"

#include "geo/Angles.h"

#include <cmath>

namespace {

constexpr double kMinScaleFactor = 0.3;
constexpr double kMaxScaleFactor = 3.0;
constexpr double kWarningLongitudeSpan = 0.15707963267948966;  // 9 degrees
constexpr double kNegligibleLongitude = 2.0e-10;                // radians, treated as 0
constexpr double kNegligibleEasting = 0.0001;                   // metres, treated as 0
constexpr int kFootpointIterations = 5;

// Distance along the meridian from the equator to latitude phi.
double MeridionalArc(const TransverseMercatorParams& p, double phi)
{
    return p.ap * phi - p.bp * std::sin(2.0 * phi) + p.cp * std::sin(4.0 * phi)
         - p.dp * std::sin(6.0 * phi) + p.ep * std::sin(8.0 * phi);
}

// Meridian radius of curvature at latitude phi.
double MeridianRadius(const TransverseMercatorParams& p, double phi)
{
    const double s = std::sin(phi);
    return p.a * (1.0 - p.es) / std::pow(1.0 - p.es * s * s, 1.5);
}

// Prime-vertical radius of curvature at latitude phi.
double NormalRadius(const TransverseMercatorParams& p, double phi)
{
    const double s = std::sin(phi);
    return p.a / std::sqrt(1.0 - p.es * s * s);
}

// A longitude is in range when it lies within a quarter turn of the central
// meridian, either as given or with both angles moved into [0, 2 pi).
bool WithinQuarterTurn(double longitude, double lambda0)
{
    if (Within(longitude, lambda0 - kHalfPi, lambda0 + kHalfPi))
        return true;
    const double movedLongitude = longitude < 0.0 ? longitude + kTwoPi : longitude;
    const double movedLambda0 = lambda0 < 0.0 ? lambda0 + kTwoPi : lambda0;
    return Within(movedLongitude, movedLambda0 - kHalfPi, movedLambda0 + kHalfPi);
}

// Folds a latitude that the series carried past a pole back into
// [-pi/2, pi/2], turning the longitude half-way round at each fold. Two folds
// are a whole turn, so whole turns are removed first: far from the central
// meridian the series can give latitudes of many turns, and folding those one
// at a time would practically never end.
void FoldOverPoles(double& latitude, double& longitude)
{
    latitude = std::remainder(latitude, kTwoPi);
    while (latitude > kHalfPi || latitude < -kHalfPi) {
        latitude = latitude > kHalfPi ? kPi - latitude : -(latitude + kPi);
        longitude += kPi;
        if (longitude > kPi)
            longitude -= kTwoPi;
    }
}

} // namespace

uint32_t SetTransverseMercatorParams(TransverseMercatorParams& params, double a, double b,
                                     double phi0, double lambda0, double FE, double FN, double k0)
{
    uint32_t status = 0;
    if (!(a > 0.0))
        status |= kTmSemiMajorAxisError;
    if (!(b > 0.0))
        status |= kTmSemiMinorAxisError;
    if (b > a)
        status |= kTmAxisOrderError;
    if (!Within(phi0, -kHalfPi, kHalfPi))
        status |= kTmOriginLatitudeError;
    if (!Within(lambda0, -kPi, kTwoPi))
        status |= kTmCentralMeridianError;
    if (!Within(k0, kMinScaleFactor, kMaxScaleFactor))
        status |= kTmScaleFactorError;
    if (status != 0)
        return status;

    TransverseMercatorParams next;
    next.a = a;
    next.b = b;
    next.es = (a * a - b * b) / (a * a);
    next.ebs = (a * a - b * b) / (b * b);

    const double n = (a - b) / (a + b);
    const double n2 = n * n;
    const double n3 = n2 * n;
    const double n4 = n3 * n;
    const double n5 = n4 * n;
    next.ap = a * (1.0 - n + 5.0 / 4.0 * (n2 - n3) + 81.0 / 64.0 * (n4 - n5));
    next.bp = 3.0 * a / 2.0 * (n - n2 + 7.0 / 8.0 * (n3 - n4) + 55.0 / 64.0 * n5);
    next.cp = 15.0 * a / 16.0 * (n2 - n3 + 3.0 / 4.0 * (n4 - n5));
    next.dp = 35.0 * a / 48.0 * (n3 - n4 + 11.0 / 16.0 * n5);
    next.ep = 315.0 * a / 512.0 * (n4 - n5);

    // The spans are the grid extent of a quarter turn from a unit-scale origin:
    // the pole for northings, the equator a quarter turn east for eastings.
    double unused = 0.0;
    TransverseMercatorForward(next, kHalfPi, kHalfPi, unused, next.dN);
    TransverseMercatorForward(next, 0.0, kHalfPi, next.dE, unused);

    next.phi0 = phi0;
    next.lambda0 = lambda0 > kPi ? lambda0 - kTwoPi : lambda0;
    next.FN = FN;
    next.FE = FE;
    next.k0 = k0;
    params = next;
    return 0;
}

uint32_t TransverseMercatorForward(const TransverseMercatorParams& p, double latitude,
                                   double longitude, double& easting, double& northing)
{
    if (longitude > kPi)
        longitude -= kTwoPi;
    uint32_t status = 0;
    if (!Within(latitude, -kHalfPi, kHalfPi))
        status |= kTmLatitudeError;
    if (!WithinQuarterTurn(longitude, p.lambda0))
        status |= kTmLongitudeError;
    if (status != 0)
        return status;

    double dl = longitude - p.lambda0;
    if (std::fabs(dl) > kWarningLongitudeSpan)
        status = kTmDistortionWarning;
    if (dl > kPi)
        dl -= kTwoPi;
    if (dl < -kPi)
        dl += kTwoPi;
    if (std::fabs(dl) < kNegligibleLongitude)
        dl = 0.0;

    const double s = std::sin(latitude);
    const double c = std::cos(latitude);
    const double c3 = c * c * c;
    const double c5 = c3 * c * c;
    const double c7 = c5 * c * c;
    const double t = std::tan(latitude);
    const double t2 = t * t;
    const double t4 = t2 * t2;
    const double t6 = t4 * t2;
    const double eta = p.ebs * c * c;
    const double eta2 = eta * eta;
    const double eta3 = eta2 * eta;
    const double eta4 = eta3 * eta;
    const double sn = NormalRadius(p, latitude);
    const double k0 = p.k0;

    const double dl2 = dl * dl;
    const double dl3 = dl2 * dl;
    const double dl4 = dl3 * dl;
    const double dl5 = dl4 * dl;
    const double dl6 = dl5 * dl;
    const double dl7 = dl6 * dl;
    const double dl8 = dl7 * dl;

    northing = p.FN + k0 * (MeridionalArc(p, latitude) - MeridionalArc(p, p.phi0))
             + dl2 * sn * s * c * k0 / 2.0
             + dl4 * sn * s * c3 * k0 * (5.0 - t2 + 9.0 * eta + 4.0 * eta2) / 24.0
             + dl6 * sn * s * c5 * k0
                   * (61.0 - 58.0 * t2 + t4 + 270.0 * eta - 330.0 * t2 * eta + 445.0 * eta2
                      + 324.0 * eta3 - 680.0 * t2 * eta2 + 88.0 * eta4 - 600.0 * t2 * eta3
                      - 192.0 * t2 * eta4)
                   / 720.0
             + dl8 * sn * s * c7 * k0 * (1385.0 - 3111.0 * t2 + 543.0 * t4 - t6) / 40320.0;

    easting = p.FE + dl * sn * c * k0
            + dl3 * sn * c3 * k0 * (1.0 - t2 + eta) / 6.0
            + dl5 * sn * c5 * k0
                  * (5.0 - 18.0 * t2 + t4 + 14.0 * eta - 58.0 * t2 * eta + 13.0 * eta2
                     + 4.0 * eta3 - 64.0 * t2 * eta2 - 24.0 * t2 * eta3)
                  / 120.0
            + dl7 * sn * c7 * k0 * (61.0 - 479.0 * t2 + 179.0 * t4 - t6) / 5040.0;
    return status;
}

uint32_t TransverseMercatorInverse(const TransverseMercatorParams& p, double easting,
                                   double northing, double& latitude, double& longitude)
{
    uint32_t status = 0;
    if (!Within(easting, p.FE - p.dE, p.FE + p.dE))
        status |= kTmEastingError;
    if (!Within(northing, p.FN - p.dN, p.FN + p.dN))
        status |= kTmNorthingError;
    if (status != 0)
        return status;

    // Footpoint latitude: the latitude whose meridional arc is the true
    // meridional distance, by Newton steps from the equator's curvature.
    const double tmd = MeridionalArc(p, p.phi0) + (northing - p.FN) / p.k0;
    double phi = tmd / (p.a * (1.0 - p.es));
    for (int i = 0; i < kFootpointIterations; ++i)
        phi += (tmd - MeridionalArc(p, phi)) / MeridianRadius(p, phi);

    const double sr = MeridianRadius(p, phi);
    const double sn = NormalRadius(p, phi);
    const double sn3 = sn * sn * sn;
    const double sn5 = sn3 * sn * sn;
    const double sn7 = sn5 * sn * sn;
    const double c = std::cos(phi);
    const double t = std::tan(phi);
    const double t2 = t * t;
    const double t4 = t2 * t2;
    const double t6 = t4 * t2;
    const double eta = p.ebs * c * c;
    const double eta2 = eta * eta;
    const double eta3 = eta2 * eta;
    const double eta4 = eta3 * eta;
    const double k0 = p.k0;
    const double k02 = k0 * k0;
    const double k03 = k02 * k0;
    const double k04 = k03 * k0;
    const double k05 = k04 * k0;
    const double k06 = k05 * k0;
    const double k07 = k06 * k0;
    const double k08 = k07 * k0;

    double de = easting - p.FE;
    if (std::fabs(de) < kNegligibleEasting)
        de = 0.0;
    const double de2 = de * de;
    const double de3 = de2 * de;
    const double de4 = de3 * de;
    const double de5 = de4 * de;
    const double de6 = de5 * de;
    const double de7 = de6 * de;
    const double de8 = de7 * de;

    double phiOut = phi - t * de2 / (2.0 * sr * sn * k02)
                  + t * de4 * (5.0 + 3.0 * t2 + eta - 4.0 * eta2 - 9.0 * t2 * eta)
                        / (24.0 * sr * sn3 * k04)
                  - t * de6
                        * (61.0 + 90.0 * t2 + 46.0 * eta + 45.0 * t4 - 252.0 * t2 * eta
                           - 3.0 * eta2 + 100.0 * eta3 - 66.0 * t2 * eta2 - 90.0 * t4 * eta
                           + 88.0 * eta4 + 225.0 * t4 * eta2 + 84.0 * t2 * eta3
                           - 192.0 * t2 * eta4)
                        / (720.0 * sr * sn5 * k06)
                  + t * de8 * (1385.0 + 3633.0 * t2 + 4095.0 * t4 + 1575.0 * t6)
                        / (40320.0 * sr * sn7 * k08);

    const double dl = de / (c * sn * k0)
                    - de3 * (1.0 + 2.0 * t2 + eta) / (6.0 * sn3 * c * k03)
                    + de5
                          * (5.0 + 6.0 * eta + 28.0 * t2 - 3.0 * eta2 + 8.0 * t2 * eta
                             + 24.0 * t4 - 4.0 * eta3 + 4.0 * t2 * eta2 + 24.0 * t2 * eta3)
                          / (120.0 * sn5 * c * k05)
                    - de7 * (61.0 + 662.0 * t2 + 1320.0 * t4 + 720.0 * t6)
                          / (5040.0 * sn7 * c * k07);
    double lambdaOut = p.lambda0 + dl;

    FoldOverPoles(phiOut, lambdaOut);
    if (lambdaOut > kTwoPi)
        lambdaOut -= kTwoPi;
    if (lambdaOut < -kPi)
        lambdaOut += kTwoPi;

    latitude = phiOut;
    longitude = lambdaOut;
    return std::fabs(dl) > kWarningLongitudeSpan ? kTmDistortionWarning : 0;
}
