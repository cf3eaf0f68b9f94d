// The answer behind RH_IsFormat: RPF frames are recognised from the NITF file
// header alone; other NITF files when their first image subheader parses and
// its data can be prepared for reading.
#pragma once

bool ProbeFormat(const char* path);
