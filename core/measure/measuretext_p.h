// What rates say of themselves, as plain text.
#pragma once

#include <string>

class QvBitrate;
class QvFramerate;

// As in "23.98p -> 59.94i PD(A)" or "59.94i DF".
std::string qvRateText(const QvFramerate& rate, bool showDf, bool showPulldown);

// As in "CBR, 128kbps".
std::string qvBitrateText(const QvBitrate& rate);

// Whether `other` is the same rate. `exact` demands the same interlaced and pulldown, otherwise their kinds
// suffice; `compareDf` compares df for the NTSC rates that know drop frame.
bool qvRateMatches(const QvFramerate& rate, const QvFramerate& other, bool exact, bool compareDf);
