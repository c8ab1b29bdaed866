#include "core/media/quality/qvpicturequality.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <limits>
#include <utility>

#include "core/engine/status.h"
#include "core/media/quality/sampleview_p.h"
#include "core/media/qvframe.h"

namespace {

constexpr int block = 4;  // samples; a window is two blocks wide and high

double psnrOf(double mse, int peak) {
    if (mse <= 0) return std::numeric_limits<double>::infinity();
    return 10.0 * std::log10(static_cast<double>(peak) * peak / mse);
}

template <class Word>
long long squaredDifferences(const SampleView& a, const SampleView& b, int stepA, int stepB, int y) {
    const unsigned char* const from = a.row(y);
    const unsigned char* const to = b.row(y);
    unsigned long long sum = 0;
    for (int x = 0; x < a.width; ++x) {
        const int difference = qvSampleAt<Word>(from, stepA, x) - qvSampleAt<Word>(to, stepB, x);
        const auto size = static_cast<unsigned>(std::abs(difference));
        sum += size * size;
    }
    return static_cast<long long>(sum);
}

// Neighbouring samples have a loop of their own, which the compiler can make wide.
template <class Word>
long long rowDifferences(const SampleView& a, const SampleView& b, int y) {
    constexpr int size = sizeof(Word);
    if (a.step == size && b.step == size) return squaredDifferences<Word>(a, b, size, size, y);
    return squaredDifferences<Word>(a, b, a.step, b.step, y);
}

// Of a window of `count` samples, with the constants that keep flat windows stable.
double similarity(double a, double b, double squares, double products, double count, double peak) {
    const double c1 = 0.01 * 0.01 * peak * peak * count;
    const double c2 = 0.03 * 0.03 * peak * peak * count * std::max(count - 1, 1.0);
    const double variances = squares * count - a * a - b * b;
    const double covariance = products * count - a * b;
    return (2 * a * b + c1) * (2 * covariance + c2) / ((a * a + b * b + c1) * (variances + c2));
}

}  // namespace

double QvPlaneQuality::psnr() const { return psnrOf(mse, peak); }

double QvPictureQuality::mse() const {
    double sum = 0, samples = 0;
    for (int i = 0; i < planes; ++i) {
        const QvPlaneQuality& of = plane[static_cast<std::size_t>(i)];
        sum += of.mse * static_cast<double>(of.samples);
        samples += static_cast<double>(of.samples);
    }
    return samples > 0 ? sum / samples : 0.0;
}

double QvPictureQuality::psnr() const { return psnrOf(mse(), plane[0].peak); }

double QvPictureQuality::ssim() const {
    double sum = 0, samples = 0;
    for (int i = 0; i < planes; ++i) {
        const QvPlaneQuality& of = plane[static_cast<std::size_t>(i)];
        sum += of.ssim * static_cast<double>(of.samples);
        samples += static_cast<double>(of.samples);
    }
    return samples > 0 ? sum / samples : 1.0;
}

void QvQualityMean::add(const QvPictureQuality& quality) {
    if (count_++ == 0) {
        sum_ = quality;
        return;
    }
    for (std::size_t i = 0; i < sum_.plane.size(); ++i) {
        sum_.plane[i].mse += quality.plane[i].mse;
        sum_.plane[i].ssim += quality.plane[i].ssim;
    }
}

QvPictureQuality QvQualityMean::mean() const {
    QvPictureQuality mean = sum_;
    for (QvPlaneQuality& plane : mean.plane) {
        if (count_ == 0) break;
        plane.mse /= count_;
        plane.ssim /= count_;
    }
    return mean;
}

// A window is four blocks; a row of windows needs the blocks of two rows.
template <class Word>
double QvQualityMeter::ssim(const SampleView& a, const SampleView& b) {
    const auto sumsOf = [&](int left, int top, int width, int height) {
        Sums sums;
        for (int y = top; y < top + height; ++y) {
            const unsigned char* const from = a.row(y);
            const unsigned char* const to = b.row(y);
            for (int x = left; x < left + width; ++x) {
                const long long va = qvSampleAt<Word>(from, a.step, x);
                const long long vb = qvSampleAt<Word>(to, b.step, x);
                sums.a += va;
                sums.b += vb;
                sums.squares += va * va + vb * vb;
                sums.products += va * vb;
            }
        }
        return sums;
    };
    const auto ofWindow = [&](const Sums& sums, double count) {
        return similarity(static_cast<double>(sums.a), static_cast<double>(sums.b),
                          static_cast<double>(sums.squares), static_cast<double>(sums.products), count,
                          a.peak());
    };
    const int columns = a.width / block, rows = a.height / block;
    if (columns < 2 || rows < 2)
        return ofWindow(sumsOf(0, 0, a.width, a.height), static_cast<double>(a.width) * a.height);

    above_.resize(static_cast<std::size_t>(columns));
    below_.resize(static_cast<std::size_t>(columns));
    const auto readBlocks = [&](int row, std::vector<Sums>& to) {
        for (int i = 0; i < columns; ++i)
            to[static_cast<std::size_t>(i)] = sumsOf(i * block, row * block, block, block);
    };
    readBlocks(0, below_);
    double sum = 0;
    for (int row = 1; row < rows; ++row) {
        std::swap(above_, below_);
        readBlocks(row, below_);
        for (std::size_t i = 1; i < below_.size(); ++i) {
            const Sums &nw = above_[i - 1], &ne = above_[i], &sw = below_[i - 1], &se = below_[i];
            const Sums window{nw.a + ne.a + sw.a + se.a, nw.b + ne.b + sw.b + se.b,
                              nw.squares + ne.squares + sw.squares + se.squares,
                              nw.products + ne.products + sw.products + se.products};
            sum += ofWindow(window, 4.0 * block * block);
        }
    }
    return sum / (static_cast<double>(columns - 1) * (rows - 1));
}

template <class Word>
void QvQualityMeter::measurePlane(const SampleView& a, const SampleView& b, QvPlaneQuality& out) {
    out = {.name = a.name, .peak = a.peak(), .samples = static_cast<long long>(a.width) * a.height};
    if (out.samples == 0) return;
    double sum = 0;
    for (int y = 0; y < a.height; ++y) sum += static_cast<double>(rowDifferences<Word>(a, b, y));
    out.mse = sum / static_cast<double>(out.samples);
    out.ssim = ssim<Word>(a, b);
}

int QvQualityMeter::measure(const QvFrame& a, const QvFrame& b, QvPictureQuality& out) {
    out = QvPictureQuality();
    const bool same = a.inited() && b.inited() && a.four_cc() == b.four_cc() && a.width() == b.width() &&
                      a.height() == b.height();
    if (!same) return QvStatus::invalidArgument;
    const SampleViews first = qvSampleViews(a);
    const SampleViews second = qvSampleViews(b);
    if (first.count == 0) return QvStatus::notSupported;
    for (out.planes = 0; out.planes < first.count; ++out.planes) {
        const auto i = static_cast<std::size_t>(out.planes);
        if (first.view[i].bytes == 1)
            measurePlane<std::uint8_t>(first.view[i], second.view[i], out.plane[i]);
        else
            measurePlane<std::uint16_t>(first.view[i], second.view[i], out.plane[i]);
    }
    return QvStatus::ok;
}
