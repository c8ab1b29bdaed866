// The byte pairs of a CEA-608 field as characters and control codes. Control codes are sent twice and meant
// once; on the second field extended data services may stand between captions.
#pragma once

struct QvLine21Code {
    enum Kind {
        nothing,     // the repetition of a control code, or service data
        characters,  // basic ones, `first` and `second`; a byte below 0x20 is none
        address,     // of a row
        special,     // a character
        style,       // which takes a column
        extended,    // a character that replaces the one before it
        tab,         // of 1 to 3 columns: `second` - 0x20
        command,     // such as "erase displayed memory"
        unknown,     // a control code without a meaning in captions
    };
    Kind kind = nothing;
    int first = 0;  // for control codes the lowest three bits alone, 0 to 7
    int second = 0;
    bool secondChannel = false;  // of a control code; characters belong to the channel of the last one
};

class QvLine21Reader {
  public:
    // `hasServices`: of the second field.
    explicit QvLine21Reader(bool hasServices) : hasServices_(hasServices) {}
    // The next pair, without parity bits.
    QvLine21Code take(int first, int second);

  private:
    bool hasServices_;
    bool inService_ = false;
    int lastControl_ = 0;
};
