// What an application uses to describe the filters of a stream before there is a pipe: real filter objects
// that it can configure, a front and a back list of them, and for video one each of flipper, deinterlacer and
// cropper. All filters are owned by the setup; pointers that it hands out end with removeFilter or with it.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/value/any.h"

class FiltersState;
class QvCodec;
class QvRect;

enum QvTimecodeMode { QV_TIMECODE_FRAME_NUMBER = 0, QV_TIMECODE_TIMECODE = 1 };

enum QvDeinterlaceMethod {
    QV_DEINTERLACE_NONE = 0,
    QV_DEINTERLACE_TOP = 1,
    QV_DEINTERLACE_BOTTOM = 2,
    QV_DEINTERLACE_REVERSE = 3,
    QV_DEINTERLACE_BOB = 4
};

class QV_API QvFilterSetup {
  public:
    QvFilterSetup();
    QvFilterSetup(const QvFilterSetup&) = delete;
    QvFilterSetup& operator=(const QvFilterSetup&) = delete;
    virtual ~QvFilterSetup();

    // Writes the filters' stored states; what `state` held is gone. The options have no effect.
    virtual void store(FiltersState& state, int options = 0) const = 0;
    // Always asserts: saved state is applied by QvProcessUtil, which makes the pipe.
    virtual int restore(const FiltersState& state) = 0;
    // Makes a filter of that module, active and last of its list. Null, with an error in the log, when there
    // is no such module.
    virtual QvCodec* addFilter(const char* name, bool front);
    // Deletes the filter; one that is not of this setup is ignored.
    virtual void removeFilter(QvCodec* filter);
    virtual int nrFilters(bool front, bool back) const;
    // The first filter of that name in the front list, then in the back list; null without one.
    virtual QvCodec* filter(const char* name) const;
    virtual QvCodec* filter(int index, bool front) const;  // null out of range

  protected:
    struct Private;
    void storeLists(FiltersState& state) const;
    void storeSingles(FiltersState& state) const;
    QvCodec* single(const char* name) const;
    void removeSingle(const char* name);
    // Makes an active filter of that module as the one of its name; null without such a module.
    QvCodec* replaceSingle(const char* name);

  private:
    std::unique_ptr<Private> p_;
};

class QV_API QvVFilterSetup : public QvFilterSetup {
  public:
    void store(FiltersState& state, int options = 0) const override;
    int restore(const FiltersState& state) override;

    // Each returns the new filter, or null.
    QvCodec* addLogo(const Any& filename, int x, int y, bool front);
    QvCodec* addTimecode(QvTimecodeMode mode, const Any& font, bool front);
    QvCodec* addBrightness(double brightness, double contrast, double gamma, bool front);
    // `callback` is called with `context` as the module "userdata" says; both outlive the filter.
    QvCodec* addUserDataCallback(const void* callback, const void* context, bool front);

    void setFlip(bool flip);
    void setDeinterlace(QvDeinterlaceMethod method);
    // Mode 0 removes the cropper. The rectangle counts from an area of 1 on, except in modes 4 and 5, which
    // derive their box; pads are in pixels.
    void setCrop(int mode, int inputWidth, int inputHeight, const QvRect& crop, int padTop, int padBottom,
                 int padLeft, int padRight);
    QvCodec* cropFilter() const;
    QvCodec* deinterlaceFilter() const;
    QvCodec* flipFilter() const;
};

class QV_API QvAFilterSetup : public QvFilterSetup {
  public:
    void store(FiltersState& state, int options = 0) const override;
    int restore(const FiltersState& state) override;

    QvCodec* addVolume(double volumedB, bool mute, bool front);
};
