// The statistics of coded frames as text. Internal to this folder.
#pragma once

#include <string>
#include <vector>

struct QualityFrame {
    unsigned bytes = 0;
    std::vector<double> values;  // PSNR in dB and SSIM, see QvPSNRLogger
};

// A line a frame: number, bytes and values, with tabs between them.
std::string qvQualityLines(const std::vector<QualityFrame>& frames);
// The same with a line of names first, and commas; "inf" for equal planes.
std::string qvQualityCsv(const std::vector<QualityFrame>& frames);
// {"frames":[{"frame":0,"bytes":812,"psnr_y":41.2,...},...],"mean":{"bytes":...,"psnr_y":...}}; the mean PSNR
// is computed from the mean of the square errors; null means infinity.
std::string qvQualityJson(const std::vector<QualityFrame>& frames);
