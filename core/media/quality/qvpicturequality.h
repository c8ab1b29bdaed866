// How far a picture is from another one of its size and pixel format.
//
//     QvQualityMeter meter;
//     QvPictureQuality quality;
//     if (meter.measure(original, coded, quality) == 0) printf("%.2f dB\n", quality.psnr());
//
// Planes are Y, U, V or R, G, B; alpha is not looked at. PSNR is 10 log10(peak^2 / mse), infinite for equal
// samples. SSIM is the mean over windows of 8x8 samples that overlap by 4 in both directions; a plane that is
// smaller is one window. Formats: GRAY, I420, YV12, I422, W016, YUY2, YUYV, UYVY, Y216, BGR3, BGR4, BGRA and
// ARGB.
#pragma once

#include <array>
#include <vector>

#include "core/arch/api.h"

class QvFrame;
struct SampleView;

struct QV_API QvPlaneQuality {
    char name = 'Y';
    int peak = 255;         // the largest value of a sample
    long long samples = 0;  // 0 only for a picture without any
    double mse = 0.0;       // mean of the squared differences
    double ssim = 1.0;      // -1 to 1, 1 for equal planes

    double psnr() const;  // dB
};

// Of all planes: each counts by its samples.
struct QV_API QvPictureQuality {
    int planes = 0;
    std::array<QvPlaneQuality, 3> plane;

    double mse() const;
    double psnr() const;
    double ssim() const;
};

// The mean of many pictures of one format: SSIM is the mean of theirs, PSNR that of the mean of their mse.
class QV_API QvQualityMean {
  public:
    void add(const QvPictureQuality& quality);
    int count() const { return count_; }
    QvPictureQuality mean() const;  // no planes before the first picture

  private:
    QvPictureQuality sum_;
    int count_ = 0;
};

// Keeps its working memory from picture to picture. One thread at a time.
class QV_API QvQualityMeter {
  public:
    // 0; QvStatus::invalidArgument for empty pictures and for two that differ in size or format;
    // QvStatus::notSupported for another format.
    int measure(const QvFrame& a, const QvFrame& b, QvPictureQuality& out);

  private:
    struct Sums {
        long long a = 0, b = 0, squares = 0, products = 0;
    };

    template <class Word>
    void measurePlane(const SampleView& a, const SampleView& b, QvPlaneQuality& out);
    template <class Word>
    double ssim(const SampleView& a, const SampleView& b);

    std::vector<Sums> above_, below_;  // of the blocks of 4x4 samples in two rows of them
};
