// The file of a picture while it is written.
#pragma once

#include <cstdio>
#include <memory>
#include <string>

class QvCancel;

// What the user log says; the first takes the name.
constexpr char qvPictureNotOpened[] = "[Save image] Can not open %s for writing.";
constexpr char qvPictureNotWritten[] = "Can not write file";

class PictureFile {
  public:
    PictureFile() = default;
    ~PictureFile() { finish(false); }
    PictureFile(const PictureFile&) = delete;
    PictureFile& operator=(const PictureFile&) = delete;

    // Creates or truncates; see QvPlatform::openOutput. False with errno.
    bool open(const std::string& name, const std::shared_ptr<QvCancel>& cancel);
    std::FILE* get() const { return file_; }
    // Closes. True if the file was `written` and all of it has left the C library; otherwise nothing is left
    // that looks like a picture (devices and pipes stay), and errno has the reason of what failed first.
    bool finish(bool written);

  private:
    std::FILE* file_ = nullptr;
    bool isStream_ = false;
    std::string name_;
};
