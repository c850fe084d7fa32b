#!/usr/bin/env python3
"""Writes python-track.gpx with Python's own XML writer, so the GPX reader is
checked against a file it did not make. The values are listed again in
tests/location/GpxTest.cpp."""
import xml.etree.ElementTree as ET

GPX = "http://www.topografix.com/GPX/1/1"
TPX = "http://www.garmin.com/xmlschemas/TrackPointExtension/v2"
ET.register_namespace("", GPX)
ET.register_namespace("gpxtpx", TPX)

# lat, lon, ele, time, speed, course, hdop
POINTS = [
    ("52.520008", "13.404954", "34.5", "2026-03-01T10:00:00Z", "12.5", "90", None),
    ("52.520100", "13.405100", None, "2026-03-01T11:00:01.250+01:00", None, None, "2.0"),
    ("52.520200", "13.405300", "35", "2026-03-01T10:00:03.5Z", "0", "359.5", None),
]

gpx = ET.Element(f"{{{GPX}}}gpx", version="1.1", creator="python xml.etree")
trk = ET.SubElement(gpx, f"{{{GPX}}}trk")
ET.SubElement(trk, f"{{{GPX}}}name").text = "python track"
seg = ET.SubElement(trk, f"{{{GPX}}}trkseg")
for lat, lon, ele, time, speed, course, hdop in POINTS:
    pt = ET.SubElement(seg, f"{{{GPX}}}trkpt", lat=lat, lon=lon)
    if ele is not None:
        ET.SubElement(pt, f"{{{GPX}}}ele").text = ele
    ET.SubElement(pt, f"{{{GPX}}}time").text = time
    if hdop is not None:
        ET.SubElement(pt, f"{{{GPX}}}hdop").text = hdop
    if speed is not None:
        ext = ET.SubElement(pt, f"{{{GPX}}}extensions")
        tpx = ET.SubElement(ext, f"{{{TPX}}}TrackPointExtension")
        ET.SubElement(tpx, f"{{{TPX}}}speed").text = speed
        ET.SubElement(tpx, f"{{{TPX}}}course").text = course
# A second segment after a pause, as a device writes after losing the fix.
seg2 = ET.SubElement(trk, f"{{{GPX}}}trkseg")
pt = ET.SubElement(seg2, f"{{{GPX}}}trkpt", lat="-33.8688", lon="151.2093")
ET.SubElement(pt, f"{{{GPX}}}time").text = "2026-03-01T10:01:00Z"

ET.ElementTree(gpx).write("python-track.gpx", encoding="UTF-8", xml_declaration=True)
