// The programs of a multiplexer. Without QvIProgramSetup (core/encode/qvmuxer.h) it has none.
#pragma once

#include <vector>

#include "core/encode/qvmuxer.h"

class PipeHost;

class ProgramList {
  public:
    // `muxer` is borrowed and may be null.
    explicit ProgramList(const QvMuxer* muxer);

    // As in QvIProgramSetup. Without it 0 programs, and QvStatus::failed.
    int count() const;
    int add(const QvProgram& program);
    int remove(int index);  // an index outside the list is an assertion
    int get(int index, QvProgram& program) const;
    int set(int index, const QvProgram& program);
    int streams(int index, AnyVector& pairs) const;

    std::vector<QvProgram> all() const;
    // Does nothing without QvIProgramSetup. Stops at the first program that is refused, which is a failure of
    // the pipe.
    int addAll(const std::vector<QvProgram>& programs, PipeHost& host);

    // The stored form: dictionaries of "program_PID", "program_number" and "PCR_PID"; other elements are
    // passed over.
    static AnyVector toState(const std::vector<QvProgram>& programs);
    static std::vector<QvProgram> fromState(const AnyVector& state);

  private:
    QvIProgramSetup* setup_;
};
