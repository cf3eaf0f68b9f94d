#!/usr/bin/env python3
"""Writes data/geoconvert_reference.txt: UTM and MGRS conversions computed by
GeoConvert (geographiclib-tools), the reference for the geolocation tests.

Rows (whitespace-separated, '#' starts a comment):
  utm  latitude longitude requestedZone zone hemisphere easting northing
  mgrs reference zone hemisphere easting northing
Latitudes and longitudes are in degrees. For MGRS rows the easting and
northing are the south-west corner of the referenced square: GeoConvert gives
its centre, so half the square's size is taken off here.

Run from anywhere: python3 make_geoconvert_table.py
"""
import math
import os
import subprocess

BANDS = "CDEFGHJKLMNPQRSTUVWX"
OUTPUT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "data",
                      "geoconvert_reference.txt")


def band_bottom(letter):
    return -80 + 8 * BANDS.index(letter)


def central_meridian(zone):
    return 6 * zone - 183


def geoconvert(args, lines):
    """Runs GeoConvert over lines; returns one output line per input (None on error)."""
    result = subprocess.run(["GeoConvert"] + args, input="\n".join(lines) + "\n",
                            capture_output=True, text=True)
    outputs = result.stdout.splitlines()
    assert len(outputs) == len(lines), (args, len(outputs), len(lines))
    return [None if out.startswith("ERROR") else out for out in outputs]


def sample_points():
    """(latitude, longitude, requested zone) triples: every band, every zone,
    offsets from the central meridian within and beyond 3 degrees, the
    southern Norway and Svalbard zones, and neighbouring zones on request."""
    offsets = [0.0, 0.4, -1.3, 2.2, -2.95, 2.999, 1.0, -0.7]
    points = []
    for i in range(240):
        band = BANDS[i % len(BANDS)]
        zone = (i * 7) % 60 + 1
        top = 12 if band == "X" else 8
        latitude = band_bottom(band) + 0.25 + (i * 0.37) % (top - 0.5)
        longitude = central_meridian(zone) + offsets[i % len(offsets)]
        if band in "VX" and 0 <= longitude <= 42:
            continue  # the exceptional zones are sampled below
        points.append((round(latitude, 6), round(longitude, 6), 0))
    # Southern Norway (56-64 N) and Svalbard (72-84 N).
    for latitude in (56.1, 59.9, 63.9):
        for longitude in (0.1, 2.9, 3.1, 5.0, 8.9, 11.9, 12.1):
            points.append((latitude, longitude, 0))
    for latitude in (72.1, 78.0, 83.9):
        for longitude in (0.1, 8.9, 9.1, 15.0, 20.9, 21.1, 32.9, 33.1, 38.0, 41.9, 42.1):
            points.append((latitude, longitude, 0))
    # Beyond 3 degrees: a neighbouring zone requested, up to 9 degrees out,
    # each far from the central meridian, where the series is least accurate:
    # 395 km (just inside the 100 km easting limit of the inverse) or 470 km
    # (about as far as GeoConvert goes).
    for i in range(90):
        zone = (i * 11) % 60 + 1
        offset = 3.0 + (i * 0.1) % 6.0
        distance = 470.0 if i % 3 == 0 else 395.0
        latitude = math.degrees(math.acos(min(1.0, distance / (111.3 * offset)))) + 0.2
        if i % 4 >= 2:
            latitude = -min(latitude, 79.5)
        west = i % 2 == 0
        longitude = central_meridian(zone) + (-offset if west else offset)
        requested = zone - 1 if west else zone + 1
        requested = 60 if requested == 0 else 1 if requested == 61 else requested
        if longitude > 180:
            longitude -= 360
        if longitude < -180:
            longitude += 360
        if 56 <= latitude < 64 or latitude >= 72:
            continue  # keeps clear of the exceptional zones
        points.append((round(latitude, 6), round(longitude, 6), zone))
        points.append((round(latitude, 6), round(longitude, 6), requested))
    return points


# Zone and hemisphere edges: the 180 degree meridian from either side and
# beyond 360, the Greenwich meridian, the northern edge of southern Norway,
# Svalbard's zone boundaries at 9 and 42 degrees, the equator and just south.
EDGE_POINTS = [(10.0, -180.0, 0), (10.0, 180.0, 0), (10.0, 179.9, 0), (10.0, 360.0, 0),
               (10.0, -0.1, 0), (64.0, 5.0, 0), (75.0, 9.0, 0), (75.0, 42.0, 0),
               (0.0, 3.0, 0), (-0.000001, 3.0, 0)]

# References beside the sampled ones: both hemispheres, odd precisions and
# precision 0, the hemisphere following the band (31NEA, 31MEV), band U of
# zone 31 across the 2 000 km row cycle (31UDA is 6 000 km, not 4 000 km),
# lower case, and Svalbard's zones 31, 33, 35 and 37 in band X.
EXTRA_REFERENCES = ["31UDQ5248211717", "56HLH3356847473", "4QFJ1234567890", "31UDQ52481171",
                    "4qfj123678", "31UDQ", "31NEA", "31MEV", "31UDA", "31UDV",
                    "31XEG", "33XWG", "35XNG", "37XEG"]


def utm_rows(points):
    rows = []
    for requested in sorted({p[2] for p in points}):
        group = [p for p in points if p[2] == requested]
        args = ["-u", "-p", "6"] + (["-z", str(requested)] if requested else [])
        outputs = geoconvert(args, ["%.6f %.6f" % (lat, lon) for lat, lon, _ in group])
        for (lat, lon, _), out in zip(group, outputs):
            if out is None:
                continue
            zone_hemisphere, easting, northing = out.split()
            rows.append("utm %.6f %.6f %d %d %s %s %s" % (
                lat, lon, requested, int(zone_hemisphere[:-1]),
                zone_hemisphere[-1].upper(), easting, northing))
    return rows


def mgrs_rows(points):
    natural = [p for p in points if p[2] == 0]
    rows = []
    for precision in range(6):
        chosen = natural[precision::5]
        references = geoconvert(["-m", "-p", str(precision - 5)],
                                ["%.6f %.6f" % (lat, lon) for lat, lon, _ in chosen])
        references = [r for r in references if r is not None]
        references += [r for r in EXTRA_REFERENCES if len(r.lstrip("0123456789")) == 3 + 2 * precision]
        centres = geoconvert(["-u", "-p", "4"], references)
        half = 0.5 * 10 ** (5 - precision)
        for reference, centre in zip(references, centres):
            if centre is None:
                continue
            zone_hemisphere, easting, northing = centre.split()
            west = float(easting) - half
            south = float(northing) - half
            if west % (2 * half) or south % (2 * half):
                continue  # GeoConvert moved the centre into the band: no square corner
            rows.append("mgrs %s %d %s %.4f %.4f" % (
                reference, int(zone_hemisphere[:-1]), zone_hemisphere[-1].upper(),
                west, south))
    return rows


def main():
    points = sample_points() + EDGE_POINTS
    version = subprocess.run(["GeoConvert", "--version"], capture_output=True,
                             text=True).stdout.strip()
    with open(OUTPUT, "w") as table:
        table.write("# Written by make_geoconvert_table.py with %s\n" % version)
        table.write("# utm  latitude longitude requestedZone zone hemisphere easting northing\n")
        table.write("# mgrs reference zone hemisphere westEasting southNorthing\n")
        for row in utm_rows(points) + mgrs_rows(points):
            table.write(row + "\n")


if __name__ == "__main__":
    main()
