// What the codec libraries report goes to the engine's debug log, from whatever thread it comes.
#pragma once

namespace av {

void sendLibraryLog();   // once is enough; also bounds what one allocation of the libraries may take
void resetLibraryLog();  // to the state before

}  // namespace av
