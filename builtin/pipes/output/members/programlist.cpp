#include "builtin/pipes/output/members/programlist.h"

#include "builtin/pipes/output/members/pipehost.h"
#include "core/arch/qvassert.h"
#include "core/engine/status.h"

ProgramList::ProgramList(const QvMuxer* muxer)
    : setup_(muxer ? static_cast<QvIProgramSetup*>(muxer->getInterface(qvProgramSetupInterface)) : nullptr) {}

int ProgramList::count() const { return setup_ ? setup_->nrPrograms() : 0; }

int ProgramList::add(const QvProgram& program) {
    return setup_ ? setup_->addProgram(program) : QvStatus::failed;
}

int ProgramList::remove(int index) {
    QV_ASSERT_MSG(index >= 0 && index < count(), "EncodePipe2.removeProgram: invalid program index");
    return setup_->removeProgram(index);
}

int ProgramList::get(int index, QvProgram& program) const {
    return setup_ ? setup_->getProgram(index, program) : QvStatus::failed;
}

int ProgramList::set(int index, const QvProgram& program) {
    return setup_ ? setup_->setProgram(index, program) : QvStatus::failed;
}

int ProgramList::streams(int index, AnyVector& pairs) const {
    return setup_ ? setup_->getProgramStreams(index, pairs) : QvStatus::failed;
}

std::vector<QvProgram> ProgramList::all() const {
    std::vector<QvProgram> programs;
    for (int index = 0; index < count(); ++index) {
        QvProgram program;
        if (get(index, program) == QvStatus::ok) programs.push_back(program);
    }
    return programs;
}

int ProgramList::addAll(const std::vector<QvProgram>& programs, PipeHost& host) {
    if (!setup_) return QvStatus::ok;
    for (const auto& program : programs)
        if (setup_->addProgram(program) < 0)
            return host.fail(QvStatus::failed, "EncodePipe.restore: failed to add program");
    return QvStatus::ok;
}

AnyVector ProgramList::toState(const std::vector<QvProgram>& programs) {
    AnyVector state;
    for (const auto& program : programs)
        state.append(AnyDict("program_PID", program.program_PID, "program_number", program.program_number,
                             "PCR_PID", program.PCR_PID));
    return state;
}

std::vector<QvProgram> ProgramList::fromState(const AnyVector& state) {
    std::vector<QvProgram> programs;
    for (const auto& element : state) {
        if (!element.isDict()) continue;
        const AnyDict& entry = element.asDict();
        programs.push_back(
            {entry.getInt32("program_number"), entry.getInt32("program_PID"), entry.getInt32("PCR_PID")});
    }
    return programs;
}
