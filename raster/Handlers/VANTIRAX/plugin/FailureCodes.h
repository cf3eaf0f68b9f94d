// Failure codes thrown as `long` inside the handler and the probe and caught
// at the export layer, where they land in the handler's lastError.
#pragma once

constexpr long kCodeHeaderParse = -1;   // the NITF file header did not parse
constexpr long kCodeRowBuffer = -1;     // the row buffer could not be allocated
constexpr long kCodeNoImage = -2;       // the file header lists no image segment
constexpr long kCodeReopen = -2;        // the file could not be reopened for a draw
constexpr long kCodeSubheader = -4;     // the first image subheader did not parse
constexpr long kCodePrepare = -5;       // the image data preparation failed
constexpr long kCodeUnexpected = -100;  // any failure that is not a code
