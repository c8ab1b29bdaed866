// Inputs that are many pictures, a file each.
#pragma once

#include <optional>
#include <string>

struct PictureFiles {
    std::string first;  // the file with the lowest number
    int count = 0;      // of files, counted on from there
};

// For a name with a place for a number, "a%03d.jpg" (all that are there, from the lowest number to the
// highest), or with a range, "a[001-120].jpg". Nothing for a file that exists and for other names; throws
// Failure where such a name stands for no file.
std::optional<PictureFiles> pictureFiles(const std::string& spec);
