#include "core/transcode/link/audio/channelmatrix_p.h"

#include <algorithm>

namespace {

ChannelSource sourceOf(const Any& entry, int ownStream) {
    if (!entry.isDict()) return {.form = ChannelSource::noDictionary};
    const AnyDict& dict = entry.asDict();
    return {dict.getInt32("stream", ownStream), dict.getInt32("channel", -1),
            dict.get("channel").isInt32() ? ChannelSource::good : ChannelSource::noChannel};
}

std::string text(const Any& formatted) { return formatted.asString(""); }

std::string faultOf(const ChannelSource& source, int row, int index, const std::vector<int>& inChannels) {
    if (source.form == ChannelSource::noDictionary)
        return text(Any::sprintf("Invalid channel map at %d, %d", row, index));
    if (source.form == ChannelSource::noChannel)
        return text(Any::sprintf("Invalid channel map at %d, %d, channel", row, index));
    const int streams = static_cast<int>(inChannels.size());
    if (source.stream < 0 || source.stream >= streams)
        return text(Any::sprintf(
            "Invalid channel map for out channel %d, input stream number (%d)>= nr of input streams(%d)", row,
            source.stream, streams));
    const int channels = inChannels[static_cast<std::size_t>(source.stream)];
    if (channels < 0)
        return text(Any::sprintf("Invalid channel map at %d, %d, , can not get audio%d/channels", row, index,
                                 source.stream));
    if (source.channel < 0 || source.channel >= channels)
        return text(Any::sprintf(
            "Invalid channel map for out channel %d, input channel (%d)>= nr of input cannels(%d)", row,
            source.channel, channels));
    return "";
}

}  // namespace

ChannelMatrix::ChannelMatrix(const AnyVector& entries, int ownStream) : entries_(entries) {
    for (const Any& entry : entries_) {
        Row& row = rows_.emplace_back();
        if (entry.isVector())
            for (const Any& source : entry.asVector()) row.push_back(sourceOf(source, ownStream));
        else if (entry.isDict() && entry.isTrue())
            row.push_back(sourceOf(entry, ownStream));
    }
}

std::string ChannelMatrix::fault(int outChannels, const std::vector<int>& inChannels) const {
    if (rows_.empty())
        return "Not using audio channel map, it is 0 size, reverting to default audio channel mode.";
    if (size() != outChannels)
        return text(Any::sprintf("Not using audio channel map, it has %d out channels, and encoder has %d.",
                                 size(), outChannels));
    for (int row = 0; row < size(); ++row) {
        int index = 0;
        for (const ChannelSource& source : rows_[static_cast<std::size_t>(row)])
            if (std::string fault = faultOf(source, row, index++, inChannels); !fault.empty()) return fault;
    }
    return "";
}

std::vector<int> ChannelMatrix::streams() const {
    std::vector<int> found;
    for (const Row& row : rows_)
        for (const ChannelSource& source : row)
            if (source.channel >= 0) found.push_back(source.stream);
    std::sort(found.begin(), found.end());
    found.erase(std::unique(found.begin(), found.end()), found.end());
    return found;
}

std::string ChannelMatrix::describe(int row) const {
    std::string line;
    for (const ChannelSource& source : rows_.at(static_cast<std::size_t>(row))) {
        if (!line.empty()) line += " + ";
        line += text(Any::sprintf("[stream:%d, channel:%d]", source.stream, source.channel));
    }
    return line.empty() ? "MUTE" : line;
}
