// A frame rate with its scan flags.
#pragma once

#include "core/arch/api.h"
#include "core/measure/qvratio.h"

class Any;
class AnyVector;

// The rate counts frames, also when the picture is interlaced: 50i is 25/1 with interlaced 1.
// Rates that come in through a constructor or a setter are reduced, doubles with denominators below 10000.
//
//   pulldown    0 none; 1, 2, 3 the 3:2 kinds (display rate 5/4 of the coded rate, 3 is the advanced kind);
//               4 frame doubling (display rate twice the coded rate)
//   interlaced  0 progressive, 1 top field first, 2 bottom field first
class QV_API QvFramerate {
  public:
    QvFramerate() = default;  // 24/1 progressive
    explicit QvFramerate(const QvRatio& rate, int interlaced = 0, bool df = false, int pulldown = 0);
    explicit QvFramerate(double rate, int interlaced = 0, bool df = false, int pulldown = 0);

    void setAll(const QvRatio& rate, int interlaced, bool df, int pulldown);
    void setAll(double rate, int interlaced, bool df, int pulldown);
    void setRate(const QvRatio& rate);
    void setRate(double rate);
    void setDf(bool df) { df_ = df; }
    void setInterlaced(int interlaced) { interlaced_ = interlaced; }
    void setPulldown(int pulldown) { pulldown_ = pulldown; }

    const QvRatio& rate() const { return rate_; }
    QvRatio displayRate() const;  // what a viewer sees after pulldown; not reduced for the 3:2 kinds
    int interlaced() const { return interlaced_; }
    int pulldown() const { return pulldown_; }
    bool df() const { return df_; }
    bool isTopFirst() const { return interlaced_ == 1; }

    // Swaps the field order; a progressive rate stays.
    void reverseDominance();
    // 25, 50 or 12.5 frames a second, whatever the flags.
    bool isPAL() const;

    // The rates by tolerance (2997/100 equals 30000/1001), the flags exactly.
    bool operator==(const QvFramerate& other) const;

    // As in "23.98p -> 59.94i PD(A)" or "59.94i DF".
    Any desc(bool showDf, bool showPulldown) const;

    // Index of the first Framerate in the vector that matches this one, or -1. `exact` demands the same
    // interlaced and pulldown, otherwise their kinds suffice; `compareDf` compares df for the NTSC rates that
    // know drop frame.
    int findInVector(const AnyVector& rates, bool exact, bool compareDf) const;

    // The named rates. set.. assigns rate and interlaced and clears df and pulldown; is.. compares the rate
    // by tolerance and whether it is interlaced; f.. is a constant.
    void set23p() { *this = f23p(); }
    void set24p() { *this = f24p(); }
    void set25p() { *this = f25p(); }
    void set29p() { *this = f29p(); }
    void set30p() { *this = f30p(); }
    void set50p() { *this = f50p(); }
    void set59p() { *this = f59p(); }
    void set60p() { *this = f60p(); }
    void set50i() { *this = f50i(); }
    void set59i() { *this = f59i(); }
    void set60i() { *this = f60i(); }

    bool is23p() const;
    bool is24p() const;
    bool is25p() const;
    bool is29p() const;
    bool is30p() const;
    bool is50p() const;
    bool is59p() const;
    bool is60p() const;
    bool is50i() const;
    bool is59i() const;
    bool is60i() const;

    static const QvFramerate& f23p();
    static const QvFramerate& f24p();
    static const QvFramerate& f25p();
    static const QvFramerate& f29p();
    static const QvFramerate& f30p();
    static const QvFramerate& f50p();
    static const QvFramerate& f59p();
    static const QvFramerate& f60p();
    static const QvFramerate& f50i();
    static const QvFramerate& f59i();
    static const QvFramerate& f60i();

  private:
    QvRatio rate_;
    bool df_ = false;
    int pulldown_ = 0;
    int interlaced_ = 0;
};
