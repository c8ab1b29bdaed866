#include "builtin/decoders/testtext.h"

#include "core/caption/subtitle/qvsubtitlerender.h"
#include "core/caption/subtitle/qvsubtitles.h"
#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"

namespace {

Any testFont() { return qv_registry()->defaultFontFile(1); }

class TestText : public CardText {
  public:
    int init(int height) {
        QvTextRenderingOptions options;
        options.fontRegular = testFont();
        options.charSize = height / 16 * 7 / 8;
        return render_.init(options);
    }

    void draw(QvFrame& frame, int x, int y, const char* text) override {
        line_.text = text;
        line_.position = QvPoint(x, y);
        render_.render(frame, line_, nullptr);
    }

  private:
    QvSubtitleRender render_;
    QvSubtitle line_;
};

}  // namespace

std::unique_ptr<CardText> makeTestText(int height) {
    auto text = std::make_unique<TestText>();
    if (text->init(height) != QvStatus::ok) return nullptr;
    return text;
}

void findTestFont() { testFont(); }
