// What a work folder holds while the files of a set are exchanged: which ones come from the folder around it
// and which ones go there. The text is written once; how far the exchange has come is the name under which
// it stands, so that a step is one rename and takes no room on the disk.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

struct Manifest {
    struct Row {
        std::string hidden;  // in the work folder
        std::string name;    // in the folder around it
    };
    std::vector<Row> old, fresh;

    // Names of the file. A folder that holds it as kDraft, or not at all, has moved nothing.
    static constexpr const char* kDraft = "manifest";
    // Old files go in. What has gone in comes back out if the run ends here.
    static constexpr const char* kMovingOldIn = "moving-old-in";
    // All old files are in, new ones come out. What has not come out follows if the run ends here.
    static constexpr const char* kMovingNewOut = "moving-new-out";

    // tarsel-manifest 1
    // old HIDDEN NAME
    // new HIDDEN NAME
    // end CHECKSUM
    //
    // A byte of a name that is a space, a control character or '%' stands there as "%20".
    std::string text() const;
    // Nothing for a text that is cut, changed, of another version, or has a name that leads out of its folder
    // or occurs twice.
    static std::optional<Manifest> parse(std::string_view text);
};
