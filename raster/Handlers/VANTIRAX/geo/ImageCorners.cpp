#include "geo/ImageCorners.h"

#include "geo/Angles.h"
#include "geo/Mgrs.h"
#include "geo/Utm.h"
#include "geo/Wgs84.h"

#include "base/FieldNumbers.h"

#include <cmath>

namespace {

constexpr unsigned kSlotLength = 15;
constexpr unsigned kFirstSlot = 0;
constexpr unsigned kSecondSlot = kSlotLength;
constexpr unsigned kFourthSlot = 3 * kSlotLength;  // the third slot is not used

enum class CornerForm { kNone, kGeographic, kGeocentric, kDecimalDegrees, kUtm, kMgrs };

CornerForm FormOf(const ImageCornerFields& fields)
{
    if (fields.igeolo == nullptr)
        return CornerForm::kNone;
    switch (fields.icords) {
    case 'G':
        return CornerForm::kGeographic;
    case 'C':
        return CornerForm::kGeocentric;
    case 'D':
        return CornerForm::kDecimalDegrees;
    case 'N':
        return fields.version21 ? CornerForm::kUtm : CornerForm::kNone;
    case 'S':
        return CornerForm::kUtm;
    case 'U':
        return CornerForm::kMgrs;
    default:
        return CornerForm::kNone;
    }
}

// IGEOLO copied into a buffer of exactly 60 characters, NUL-padded when the
// text is short, so that every slot read stays inside it.
struct IgeoloText {
    char characters[kIgeoloLength + 1] = {};

    explicit IgeoloText(const char* igeolo)
    {
        for (unsigned i = 0; i < kIgeoloLength && igeolo[i] != '\0'; ++i)
            characters[i] = igeolo[i];
    }
    const char* Slot(unsigned start) const { return characters + start; }
};

// A number field; "NaN", "INF" and overflowing exponents are no number (0).
double ReadNumber(const char* text, unsigned width)
{
    const double value = FieldToDouble(text, width);
    return std::isfinite(value) ? value : 0.0;
}

// ddmmss followed by a hemisphere letter: degrees + (minutes + seconds / 60) / 60.
double ReadDegreesMinutesSeconds(const char* text, unsigned degreeDigits, char negativeHemisphere)
{
    const double degrees = ReadNumber(text, degreeDigits);
    const double minutes = ReadNumber(text + degreeDigits, 2);
    const double seconds = ReadNumber(text + degreeDigits + 2, 2);
    const double value = degrees + (minutes + seconds / 60.0) / 60.0;
    return text[degreeDigits + 4] == negativeHemisphere ? -value : value;
}

// "C" slots are written as "G" slots, but their latitudes are geocentric (the
// angle at the earth's centre): the geodetic latitude of the same point has
// tan(geodetic) = tan(geocentric) / (1 - e^2).
double GeodeticLatitude(double geocentricDegrees)
{
    const double psi = DegreesToRadians(geocentricDegrees);
    return RadiansToDegrees(std::atan2(std::sin(psi), (1.0 - kWgs84EccentricitySquared) * std::cos(psi)));
}

bool InDegrees(CornerForm form)
{
    return form == CornerForm::kGeographic || form == CornerForm::kGeocentric ||
           form == CornerForm::kDecimalDegrees;
}

// Converts one slot's 15 characters as a reference of their own (the slots
// of IGEOLO follow each other unterminated). A corner outside its latitude
// band still has its grid position; any other rejected reference gives zone
// 0 and (0, 0).
void ConvertMgrsSlot(const char* slot, int32_t& zone, char& hemisphere, double& easting,
                     double& northing)
{
    char reference[kSlotLength + 1] = {};
    for (unsigned i = 0; i < kSlotLength; ++i)
        reference[i] = slot[i];
    MgrsToUtm(reference, zone, hemisphere, easting, northing);
}

// Slot forms: "G"/"C" ddmmssXdddmmssY; "D" +dd.ddd+ddd.ddd; "N"/"S" zone (2),
// easting (6), northing (7); "U" a 15-character MGRS reference.
void ReadSlot(CornerForm form, const char* slot, double& x, double& y)
{
    switch (form) {
    case CornerForm::kGeographic:
    case CornerForm::kGeocentric:
        y = ReadDegreesMinutesSeconds(slot, 2, 'S');
        x = ReadDegreesMinutesSeconds(slot + 7, 3, 'W');
        if (form == CornerForm::kGeocentric)
            y = GeodeticLatitude(y);
        break;
    case CornerForm::kDecimalDegrees:
        y = ReadNumber(slot, 7);
        x = ReadNumber(slot + 7, 8);
        break;
    case CornerForm::kUtm:
        x = ReadNumber(slot + 2, 6);
        y = ReadNumber(slot + 8, 7);
        break;
    case CornerForm::kMgrs: {
        int32_t zone = 0;
        char hemisphere = kMgrsNoHemisphere;
        ConvertMgrsSlot(slot, zone, hemisphere, x, y);
        break;
    }
    case CornerForm::kNone:
        break;
    }
}

int32_t UtmEpsgCode(int32_t zone, bool south)
{
    if (zone < kUtmFirstZone || zone > kUtmLastZone)
        return kEpsgNone;
    return (south ? kEpsgUtmSouthBase : kEpsgUtmNorthBase) + zone;
}

int32_t MgrsEpsgCode(const char* slot)
{
    int32_t zone = 0;
    char hemisphere = kMgrsNoHemisphere;
    double easting = 0.0;
    double northing = 0.0;
    ConvertMgrsSlot(slot, zone, hemisphere, easting, northing);
    return UtmEpsgCode(zone, hemisphere != 'N');
}

} // namespace

void ReadImageCorners(const ImageCornerFields& fields, double& x1, double& y1, double& x2,
                      double& y2, double& x3, double& y3) noexcept
{
    const CornerForm form = FormOf(fields);
    if (form == CornerForm::kNone)
        return;
    const IgeoloText igeolo(fields.igeolo);
    ReadSlot(form, igeolo.Slot(kFirstSlot), x1, y1);
    ReadSlot(form, igeolo.Slot(kSecondSlot), x2, y2);
    ReadSlot(form, igeolo.Slot(kFourthSlot), x3, y3);
    if (InDegrees(form)) {
        x2 = LongitudeNear(x2, x1);
        x3 = LongitudeNear(x3, x1);
    }
}

int32_t ImageCornerEpsgCode(const ImageCornerFields& fields, int32_t geographicCode) noexcept
{
    switch (FormOf(fields)) {
    case CornerForm::kGeographic:
    case CornerForm::kGeocentric:
    case CornerForm::kDecimalDegrees:
        return geographicCode;
    case CornerForm::kUtm:
        return UtmEpsgCode(FieldToLong(IgeoloText(fields.igeolo).Slot(kFirstSlot), 2),
                           fields.icords == 'S');
    case CornerForm::kMgrs:
        return MgrsEpsgCode(IgeoloText(fields.igeolo).Slot(kFirstSlot));
    case CornerForm::kNone:
        break;
    }
    return kEpsgNone;
}
