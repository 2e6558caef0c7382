#pragma once

namespace parvel::reader {

/// Chooses the fonts that stand in for those that a document does not bring along, has their files
/// kept for later and tells fontconfig of no others: only these can be opened behind the walls.
void readyFonts();

}  // namespace parvel::reader
