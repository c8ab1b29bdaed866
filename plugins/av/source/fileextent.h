// What a file says of its own bytes, where the libraries read past what is missing without a word.
#pragma once

class QvByteSource;

namespace av {

struct FileExtent {
    long long bytes = 0;  // that the file should have; 0: not stated
    bool broken = false;  // within it there are bytes that belong to none of its parts
};

// Of Matroska and Wave64; of others nothing. Leaves the source anywhere.
FileExtent extentOf(QvByteSource& source);

}  // namespace av
