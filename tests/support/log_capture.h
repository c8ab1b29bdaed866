// Collects what the engine's debug log says while the object lives.
//
//     LogCapture log;
//     registry.scanFolder(folder);
//     EXPECT_TRUE(log.contains("No plugins found"));
#pragma once

#include <algorithm>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "core/engine/log/qvlog.h"
#include "core/value/utf.h"

class LogCapture : public QvLogBase {
  public:
    struct Line {
        int mask;
        std::string text;  // without the time
    };

    LogCapture() : before_(qv_dbg()->logger()) { qv_dbg()->setLogger(this); }
    LogCapture(const LogCapture&) = delete;
    LogCapture& operator=(const LogCapture&) = delete;
    ~LogCapture() override { qv_dbg()->setLogger(before_); }

    void logs(int mask, const unsigned short* text) override {
        std::size_t length = 0;
        while (text[length]) ++length;
        std::string line = QvUtf::toUtf8({text, length});
        line.erase(0, line.find(' ') + 1);
        const std::lock_guard lock(lock_);
        lines_.push_back({mask, std::move(line)});
    }

    std::vector<Line> lines() const {
        const std::lock_guard lock(lock_);
        return lines_;
    }
    std::vector<std::string> texts() const {
        std::vector<std::string> found;
        for (const auto& line : lines()) found.push_back(line.text);
        return found;
    }
    // How many lines hold this text; with a mask only those of that level.
    int count(std::string_view text, int mask = 0) const {
        const auto all = lines();
        return static_cast<int>(std::count_if(all.begin(), all.end(), [&](const Line& line) {
            return line.text.find(text) != std::string::npos && (mask == 0 || line.mask == mask);
        }));
    }
    bool contains(std::string_view text, int mask = 0) const { return count(text, mask) > 0; }
    void clear() {
        const std::lock_guard lock(lock_);
        lines_.clear();
    }

  private:
    QvLogBase* before_;
    mutable std::mutex lock_;
    std::vector<Line> lines_;
};
