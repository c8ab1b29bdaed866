#include "builtin/decoders/inputfile.h"

#include <gtest/gtest.h>

#include "core/engine/status.h"
#include "core/value/any.h"
#include "tests/support/temp_folder.h"

namespace {

// Nothing but zeros, of a length that may be unknown.
class Zeros : public QvByteSource {
  public:
    bool hasLength = true;

  protected:
    long long readSome(void*, std::size_t) override { return 0; }
    bool canMove() const override { return true; }
    bool moveTo(long long) override { return true; }
    long long length() override { return hasLength ? 64 : unknown; }
};

TEST(InputFile, ARefusalIsForgottenWithTheNextSource) {
    TempFolder folder;
    const Any name(folder.write("a", "abc").c_str());
    Zeros source;
    InputFile file;
    for (const bool byName : {true, false}) {
        source.hasLength = false;
        EXPECT_EQ(file.open(source), QvStatus::failed);
        EXPECT_EQ(file.problem(), ": the source does not say how long it is");
        source.hasLength = true;
        EXPECT_EQ(byName ? file.open(name, 1) : file.open(source), QvStatus::ok);
        EXPECT_EQ(file.length(), byName ? 3 : 64);
        file.close();
        EXPECT_EQ(file.problem(), "");
    }
}

}  // namespace
