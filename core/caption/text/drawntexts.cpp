#include <algorithm>

#include "core/caption/text/drawntexts_p.h"

bool DrawnText::is(const DrawnTextKey& key) const {
    return encoding == key.encoding && rgb == key.rgb && fourcc == key.fourcc && matrix == key.matrix &&
           widest == key.widest && text == key.text && fieldMasks == key.fieldMasks;
}

DrawnText* DrawnTexts::find(const DrawnTextKey& key) {
    const auto found =
        std::find_if(texts_.begin(), texts_.end(), [&key](const auto& text) { return text->is(key); });
    if (found == texts_.end()) return nullptr;
    std::rotate(texts_.begin(), found, found + 1);
    return texts_.front().get();
}

DrawnText& DrawnTexts::renew(const DrawnTextKey& key) {
    if (texts_.size() < most) texts_.push_back(std::make_unique<DrawnText>());
    std::rotate(texts_.begin(), texts_.end() - 1, texts_.end());
    DrawnText& text = *texts_.front();
    text.text = key.text;
    text.encoding = key.encoding;
    text.fieldMasks = key.fieldMasks;
    text.rgb = key.rgb;
    text.fourcc = key.fourcc;
    text.matrix = key.matrix;
    text.widest = key.widest;
    for (DrawnLine& line : text.lines) line.drawn = QvRect();
    return text;
}
