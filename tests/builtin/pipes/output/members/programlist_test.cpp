#include "tests/builtin/pipes/output/output_parts.h"

namespace {

// Takes two programs.
class ProgramMuxer : public FakeMuxer, public QvIProgramSetup {
  public:
    ProgramMuxer() : FakeMuxer("mptsmux") {}
    void* getInterface(int kind) const override {
        if (kind != qvProgramSetupInterface) return FakeMuxer::getInterface(kind);
        return static_cast<QvIProgramSetup*>(const_cast<ProgramMuxer*>(this));
    }
    int nrPrograms() const override { return static_cast<int>(programs.size()); }
    int addProgram(const QvProgram& program) override {
        if (programs.size() == 2) return QvStatus::failed;
        programs.push_back(program);
        return nrPrograms() - 1;
    }
    int removeProgram(int index) override {
        programs.erase(programs.begin() + index);
        return 0;
    }
    int getProgram(int index, QvProgram& program) const override {
        program = programs.at(static_cast<std::size_t>(index));
        return 0;
    }
    int setProgram(int, const QvProgram&) override { return 0; }
    int getProgramStreams(int, AnyVector&) const override { return 0; }

    std::vector<QvProgram> programs;
};

TEST(ProgramList, ComesBackFromItsStoredForm) {
    ProgramMuxer muxer;
    RememberingHost host;
    AnyVector state(AnyDict("program_number", 1, "program_PID", 0x40, "PCR_PID", 0x50), 7,
                    AnyDict("program_number", 2));
    const auto programs = ProgramList::fromState(state);
    ASSERT_EQ(ProgramList(&muxer).addAll(programs, host), 0);
    EXPECT_EQ(muxer.programs[0].program_PID, 0x40);
    EXPECT_EQ(muxer.programs[0].PCR_PID, 0x50);
    EXPECT_EQ(muxer.programs[1].program_number, 2);
    const AnyVector stored = ProgramList::toState(ProgramList(&muxer).all());
    EXPECT_EQ(stored.size(), 2);
    EXPECT_EQ(stored.front(), state.front());

    EXPECT_EQ(ProgramList(&muxer).addAll(programs, host), QvStatus::failed);
    EXPECT_STREQ(host.lastFailure(), "EncodePipe.restore: failed to add program");
    for (const int wrong : {-1, 2})
        EXPECT_EQ(failureOf([&] { ProgramList(&muxer).remove(wrong); }),
                  "EncodePipe2.removeProgram: invalid program index");
    EXPECT_EQ(ProgramList(&muxer).remove(0), 0);
    EXPECT_EQ(muxer.programs.front().program_number, 2);
}

TEST(ProgramList, IsEmptyWithoutAMultiplexerThatHasIt) {
    const FakeMuxer plain("rawmux");
    RememberingHost host;
    for (const QvMuxer* muxer : {static_cast<const QvMuxer*>(nullptr), static_cast<const QvMuxer*>(&plain)}) {
        ProgramList none(muxer);
        QvProgram program;
        EXPECT_EQ(none.count(), 0);
        EXPECT_EQ(none.add(program) & none.get(0, program) & none.set(0, program), QvStatus::failed);
        EXPECT_EQ(none.addAll({program}, host), 0) << "a preset's programs mean nothing to it";
    }
}

}  // namespace
