// How often cbProgress comes and what it reports.
#pragma once

class AnyDict;

class QvProgressReport {
  public:
    // `settings`: the transcoder's "progress" dictionary. `total`: frames of the run, 0 when unknown.
    // `rate`: frames a second, for settings in seconds.
    QvProgressReport(const AnyDict& settings, int total, double rate);

    // Called once a round. True when a report is due; `part` (0 to 1) is then what to report.
    bool due(double now, double& part);
    // The share of this pass in the whole: part * scale + offset.
    void setPass(double offset, double scale) { offset_ = offset, scale_ = scale; }
    int round() const { return counter_; }

    static constexpr int byTime = -1;

  private:
    double partDone() const;

    int step_ = 0;  // rounds between reports, or byTime
    int total_ = 0;
    int counter_ = 0;  // rounds so far
    int lastReported_ = -1;
    double interval_ = 0;  // seconds, when by time
    double lastTime_ = 0;
    double offset_ = 0, scale_ = 1;
};
