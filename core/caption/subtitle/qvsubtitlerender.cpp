#include "core/caption/subtitle/qvsubtitlerender.h"

#include <algorithm>
#include <new>
#include <string>
#include <string_view>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/caption/subtitle/qvsubtitles.h"
#include "core/caption/text/drawntexts_p.h"
#include "core/caption/text/qvtext.h"
#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/caption/text/styledtext_p.h"
#include "core/caption/text/textmask_p.h"
#include "core/engine/status.h"
#include "core/filter/qvcolorconvert.h"
#include "core/media/qvdraw.h"
#include "core/media/wholecopy_p.h"

namespace {

using Options = QvTextRenderingOptions;

constexpr double lineSpacing = 1.15;
constexpr double bandOverlap = 1.2;  // a band is higher than the step to the next one
constexpr int farthest = 1 << 28;    // rows; below any picture
constexpr int widthStep = 32;        // so that a running timecode keeps its pictures' memory

unsigned rgbOf(const QvColor* color) {
    return color && !color->isYuv ? color->bgr32(false) & 0xFFFFFF : 0xFFFFFF;
}

// A band is too low to tell the matrix of the picture that it is made for.
QvYUVMatrix matrixOf(const QvFrame& frame) {
    if (frame.YUVMatrix() != qvMatrixNotSet) return frame.YUVMatrix();
    return frame.height() < 720 ? qvMatrixBT601 : qvMatrixBT709;
}

std::string_view bytesOf(const Any& text) {
    if (!text.isString() && !text.isGeneric()) return {};
    return {text.asString(), static_cast<std::size_t>(text.size())};
}

QvRect common(const QvRect& a, const QvRect& b) {
    const QvRect both(std::max(a.left(), b.left()), std::max(a.top(), b.top()),
                      std::min(a.right(), b.right()), std::min(a.bottom(), b.bottom()));
    return both.left() < both.right() && both.top() < both.bottom() ? both : QvRect();
}

// Blending moves what it draws to even coordinates, so that a picture must begin and end on them.
QvRect madeEven(const QvRect& rect) {
    return QvRect(rect.left() & ~1, rect.top() & ~1, (rect.right() + 1) & ~1, (rect.bottom() + 1) & ~1);
}

// Smaller pictures can't be converted. What lies outside the target is left out when it is drawn.
QvRect largeEnough(const QvRect& rect) {
    constexpr int least = 4;
    if (rect.width() == 0) return rect;
    return QvRect(rect.left(), rect.top(), std::max(rect.right(), rect.left() + least),
                  std::max(rect.bottom(), rect.top() + least));
}

bool shape(QvFrame& frame, unsigned fourcc, const QvRect& area) {
    if (frame.inited() && frame.four_cc() == fourcc && frame.width() == area.width() &&
        frame.height() == area.height())
        return true;
    const int result = frame.init(fourcc, area.width(), area.height());
    if (result == QvStatus::outOfMemory) throw std::bad_alloc();
    return result == QvStatus::ok;
}

void fill(QvFrame& frame, unsigned rgb) {
    unsigned char r = 0, g = 0, b = 0;
    QvDraw::getrgb(rgb, &r, &g, &b);
    frame.setBlack();
    frame.setRGB(r, g, b);
}

// The rows of a picture from `top`, which is even, down to its end.
void viewFrom(QvFrame& frame, int top, QvFrame& view) {
    view.init(frame.four_cc(), frame.width(), frame.height() - top, frame.plane());
    for (int plane = 0; plane < frame.planes(); ++plane) {
        const int rows = plane == 0 ? top : top / 2;
        view.getFrame_tt()->strides[plane] = frame.stride(plane);
        view.getFrame_tt()->planes[plane] =
            frame.plane(plane) + static_cast<std::ptrdiff_t>(rows) * frame.stride(plane);
    }
}

void blendAt(QvFrame& frame, int x, int y, const DrawnLine& line) {
    if (y < frame.width()) {
        frame.blend(x, y, line.colours, &line.mask);
        return;
    }
    // A blend draws no row below the one whose number is the width, which tall pictures have.
    QvFrame view;
    viewFrom(frame, y & ~1, view);
    view.blend(x, 0, line.colours, &line.mask);
}

}  // namespace

struct QvSubtitleRender::Private {
    FontLibrary library;
    FontFaces faces;
    int encoding;  // of QvText
    int size;
    int lineHeight;
    int effect;
    bool wrap;
    int align;
    int marginX, marginY;
    DrawnTexts texts;
    QvFrame band;  // BGR4, on its way to another format or into an effect
    std::unique_ptr<QvColorConverter> converter;
    unsigned converterFourcc = 0;
    bool converterHd = false;  // to BT.709
    QvFrame letters;           // GRAY, on its way into an effect

    explicit Private(const Options& options)
        : encoding(encodingOf(options)),
          size(std::clamp(options.charSize, 0, FontFace::largestSize)),
          lineHeight(static_cast<int>(size * lineSpacing)),
          effect(options.fontEffect),
          wrap(options.wrap),
          align(std::clamp(options.align, 0, 9)),
          marginX(std::clamp(options.marginX, 0, farthest)),
          marginY(std::clamp(options.marginY, 0, farthest)) {
        if (!library.get()) return;
        const Any* files[] = {&options.fontRegular, &options.fontItalic, &options.fontBold};
        for (std::size_t i = 0; i < fontStyles; ++i)
            load(i, files[i]->isText() ? *files[i] : options.fontRegular, options);
        faces.fallBack(library, options.charSize, aspectOf(options));
    }

    void load(std::size_t style, const Any& file, const Options& options) {
        static constexpr QvFontFace likes[] = {QvFontFace::sans, QvFontFace::sansItalic,
                                               QvFontFace::sansBold};
        QvFontFile found;
        if (options.fontFamily.isText())
            found = qv_platform().fontOf(options.fontFamily.toString().asString(""), likes[style]);
        faces[style].load(library, found.name.empty() ? file : Any(found.name.c_str()), options.charSize,
                          aspectOf(options), found.face);
    }

    static double aspectOf(const Options& options) {
        const bool usable = options.pixelAspect >= 0.1 && options.pixelAspect <= 10;
        return usable ? options.pixelAspect : 1;
    }

    static int encodingOf(const Options& options) {
        switch (options.subEncoding) {
            case Options::ascii:
            case Options::utf8: return QvText::utf8;
            case Options::utf16: return QvText::utf16;
            case Options::utf32: return QvText::utf32;
            case Options::byCodePage: return options.codePage;
            default: return noEncoding;
        }
    }
    static constexpr int noEncoding = -1;  // text of which nothing can be read

    DrawnText& textOf(const DrawnTextKey& key) {
        if (DrawnText* known = texts.find(key)) return *known;
        try {
            DrawnText& text = texts.renew(key);
            layOut(text);
            return text;
        } catch (...) {
            texts.clear();  // half a layout must not be found again
            throw;
        }
    }

    static std::u32string decoded(std::string_view text, int encoding) {
        return encoding == noEncoding ? std::u32string() : QvText::toUtf32(text, encoding);
    }

    template <class Take>
    static void forLines(std::u32string_view text, Take take) {
        for (std::size_t begin = 0; begin <= text.size();) {
            const std::size_t end = std::min(text.find(U'|', begin), text.size());
            take(text.substr(begin, end - begin));
            begin = end + 1;
        }
    }

    void layOut(DrawnText& text) {
        const std::u32string all = decoded(text.text, text.encoding);
        text.align = placeTag(all);
        FontStyle style = FontStyle::regular;
        std::size_t count = 0;
        forLines(all, [&](std::u32string_view source) {
            for (TextLine& line : layOutLines(source, faces, style, text.widest)) {
                if (count == text.lines.size()) text.lines.emplace_back();
                DrawnLine& drawn = text.lines[count++];
                drawn.line = std::move(line);
                drawn.covered = coverOf(drawn.line);
            }
        });
        text.lines.resize(count);
    }

    void collectMissing(const QvSubtitle& subtitle, FontFaces::Missing& missing) {
        const bool wide = subtitle.text.isWString();
        const Any text = wide ? subtitle.text.toString() : subtitle.text;
        FontStyle style = FontStyle::regular;
        forLines(decoded(bytesOf(text), wide ? QvText::utf8 : encoding), [&](std::u32string_view line) {
            ::collectMissing(withoutTags(line, style), faces, missing);
        });
    }

    QvRect coverOf(const TextLine& line) const {
        if (line.glyphs.empty()) return QvRect();
        const int width = static_cast<int>(std::min(line.width, 1LL << 24));
        const int high = static_cast<int>(lineHeight * bandOverlap);
        const QvRect area = coveredArea(line, size, (width / widthStep + 1) * widthStep, high);
        const int margin = effect == Options::noEffect ? 0 : effectMargin;
        return madeEven(
            QvRect(area.left() - margin, area.top() - margin, area.right() + margin, area.bottom() + margin));
    }

    QvPoint placeOf(const QvFrame& frame, const QvSubtitle& subtitle, const DrawnText& text,
                    const DrawnLine& drawn, int offset) const {
        const int w = frame.width(), h = frame.height();
        const QvPoint& at = subtitle.position;
        if (at.x() >= 0 && at.x() <= w && at.y() >= -1 && at.y() <= h)
            return QvPoint(at.x(), at.y() + offset);
        const auto width = static_cast<int>(std::min(drawn.line.width, 1LL << 24));
        const int lines = static_cast<int>(std::min<std::size_t>(text.lines.size(), farthest));
        if (align != 0) {
            const QvPoint corner = alignedAt(frame, text.align ? text.align : align, width, lines);
            return QvPoint(corner.x(), corner.y() + offset);
        }
        const double below = std::clamp(size * lineSpacing * (wrap ? lines : subtitle.rows), -1e9, 1e9);
        return QvPoint(w / 2 - width / 2, offset - size / 2 - static_cast<int>(below) + h);
    }

    // The top left corner of the first of `lines` bands, if the line is `width` wide. What hangs below the
    // last baseline takes a quarter of the size.
    QvPoint alignedAt(const QvFrame& frame, int where, int width, int lines) const {
        const int column = (where - 1) % 3, row = (where - 1) / 3;
        const long long high = static_cast<long long>(lineHeight) * (lines - 1) + size + size / 4;
        const long long freeX = frame.width() - width - 2LL * marginX,
                        freeY = frame.height() - high - 2LL * marginY;
        const long long x = marginX + freeX * column / 2, y = marginY + freeY * (2 - row) / 2;
        return QvPoint(static_cast<int>(std::clamp<long long>(x, -farthest, farthest)),
                       static_cast<int>(std::clamp<long long>(y, -farthest, farthest)));
    }

    int widestLine(const QvFrame& frame) const {
        return wrap ? static_cast<int>(std::max(frame.width() - 2LL * marginX, 1LL)) : 0;
    }

    // Draws what of a line can be seen with its band at `place`, unless that has been drawn already.
    bool prepare(const DrawnText& text, DrawnLine& drawn, const QvFrame& frame, const QvPoint& place) {
        const QvRect picture(-place.x(), -place.y(), frame.width() - place.x(), frame.height() - place.y());
        const QvRect area = largeEnough(madeEven(common(drawn.covered, picture)));
        if (area.width() == 0) return false;
        if (drawn.drawn == area) return true;
        drawn.drawn = QvRect();
        if (!draw(text, drawn, area)) return false;
        drawn.drawn = area;
        return true;
    }

    bool draw(const DrawnText& text, DrawnLine& drawn, const QvRect& area) {
        const bool direct = text.fourcc == QvFourcc::BGR4;
        QvFrame& colours = direct ? drawn.colours : band;
        if (!shape(drawn.mask, QvFourcc::GRAY, area) || !shape(colours, QvFourcc::BGR4, area)) return false;
        drawLetters(drawn.line, size, text.fieldMasks, area, drawn.mask);
        fill(colours, text.rgb);
        if (effect != Options::noEffect) applyEffect(text.rgb, colours, drawn.mask);
        return direct || convert(text, drawn.colours);
    }

    bool convert(const DrawnText& text, QvFrame& out) {
        const bool hd = text.matrix == qvMatrixBT709;
        if (!converter || converterFourcc != text.fourcc || converterHd != hd)
            converter = std::make_unique<QvColorConverter>(text.fourcc, !hd, hd);
        converterFourcc = text.fourcc;
        converterHd = hd;
        const int result = converter->convert(band, out);
        if (result == QvStatus::outOfMemory) throw std::bad_alloc();
        return result == QvStatus::ok;
    }

    // Letters of the colour on black, which the mask then shows around them.
    void applyEffect(unsigned rgb, QvFrame& colours, QvFrame& mask) {
        qvCopyWhole(letters, mask);
        colours.setBlack();
        QvFrame full;
        qvCopyWhole(full, colours);
        fill(full, rgb);
        colours.blend(0, 0, full, &letters);
        outlineMask(letters, mask, 1);
        if (effect == Options::softShadow || effect == Options::hardShadow)
            addShadow(mask, effect == Options::softShadow);
    }
};

QvSubtitleRender::QvSubtitleRender() = default;
QvSubtitleRender::~QvSubtitleRender() = default;

int QvSubtitleRender::init(const QvTextRenderingOptions& options) {
    p_ = std::make_unique<Private>(options);
    return p_->library.get() ? QvStatus::ok : QvStatus::failed;
}

std::u32string QvSubtitleRender::findFonts(const QvSubtitles& subtitles) {
    if (!p_ || !p_->library.get()) return {};
    FontFaces::Missing missing;
    for (int i = 0; i < subtitles.nrSubtitles(); ++i) p_->collectMissing(*subtitles.at(i), missing);
    p_->faces.find(missing);
    return p_->faces.absent();
}

int QvSubtitleRender::render(QvFrame& frame, const QvSubtitle& subtitle, const QvColor* color) {
    QV_ASSERT(frame.inited());
    if (!p_ || !p_->library.get()) return QvStatus::ok;
    const bool wide = subtitle.text.isWString();
    const Any text = wide ? subtitle.text.toString() : Any();
    const DrawnTextKey key{bytesOf(wide ? text : subtitle.text),
                           wide ? QvText::utf8 : p_->encoding,
                           subtitle.fieldMasks,
                           rgbOf(color),
                           frame.four_cc(),
                           matrixOf(frame),
                           p_->widestLine(frame)};
    DrawnText& drawn = p_->textOf(key);
    int offset = 0;
    for (DrawnLine& line : drawn.lines) {
        if (offset > farthest) break;
        const QvPoint place = p_->placeOf(frame, subtitle, drawn, line, offset);
        if (p_->prepare(drawn, line, frame, place))
            blendAt(frame, place.x() + line.drawn.left(), place.y() + line.drawn.top(), line);
        offset += p_->lineHeight;
    }
    return QvStatus::ok;
}
