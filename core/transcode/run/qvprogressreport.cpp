#include "core/transcode/run/qvprogressreport_p.h"

#include <algorithm>
#include <climits>
#include <string_view>

#include "core/value/anycontainer.h"

namespace {

// A number of rounds out of a setting; what is no number, or below 1, means every round.
int rounds(double value) {
    if (!(value >= 1)) return 1;
    return value < INT_MAX ? static_cast<int>(value) : INT_MAX;
}

double number(const Any& value) { return value.isInt() || value.isFloat() ? value.toDouble() : 0.0; }

}  // namespace

QvProgressReport::QvProgressReport(const AnyDict& settings, int total, double rate) : total_(total) {
    const std::string_view mode = settings.empty() ? "" : settings.getKey(0);
    const double value = settings.empty() ? 0 : number(settings.getVal(0));
    if (mode == "promile") {
        step_ = total / 1000;
    } else if (mode == "frames") {
        step_ = rounds(value);
    } else if (mode == "time") {
        step_ = rounds(value * rate + 0.5);
    } else if (mode == "each") {
        step_ = 1;
    } else if (mode == "off") {
        step_ = INT_MAX;
    } else if (mode == "absoluteTime") {
        step_ = byTime;
        interval_ = value;
    } else {
        step_ = total / 100;
    }
}

double QvProgressReport::partDone() const {
    if (total_ == 0 && step_ != byTime) return offset_;
    const double part = static_cast<double>(counter_) / std::max(total_, 1);
    return std::min(part, 1.0) * scale_ + offset_;
}

bool QvProgressReport::due(double now, double& part) {
    if (step_ == byTime) {
        ++counter_;
        if (now - lastTime_ < interval_) return false;
        lastTime_ = now;
        part = partDone();
        return true;
    }
    const bool report = step_ != INT_MAX && (lastReported_ == -1 || counter_ - lastReported_ >= step_);
    if (report) {
        part = partDone();
        lastReported_ = counter_;
    }
    ++counter_;
    return report;
}
