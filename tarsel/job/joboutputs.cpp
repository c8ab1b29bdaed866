#include "tarsel/job/joboutputs.h"

#include "tarsel/words/messages.h"

JobOutputs::JobOutputs(const JobOptions& options) : options_(options) {
    if (options.muxer == "nullmux") {
        form_ = outputForm(options, OutputPlace::nowhere);
        return;
    }
    if (options.output.empty()) throw failure(Msg::outputMissing);
    stream_ = StreamOutput::find(options.output, options.inputs);
    form_ = outputForm(options, !stream_              ? OutputPlace::files
                                : stream_->discards() ? OutputPlace::nullDevice
                                                      : OutputPlace::stream);
    if (stream_) return;
    files_ = std::make_unique<Outputs>(form_.name, "-o", options.inputs, options.policy, transaction_);
    if (form_.numbered) files_->number(*form_.numbered);
}

void JobOutputs::claim(const JobPlan& plan, const std::vector<std::string>& inputs, QvEncodePipe& pipe) {
    form_ = plan.output;
    hasVideo_ = plan.hasVideo();
    inputs_ = inputs;
    if (files_) {
        files_->addInputs(inputs_);
        checkNumbers(plan);
        checkNames(pipe);
    }
    if (form_.isStream()) claimPlace(stream_->place(), stream_->name());
    claimFilterFiles(plan.filterFiles.written);
    claimTask();
}

// Names that exist are refused before any work; what is written next to the output counts as well.
void JobOutputs::checkNumbers(const JobPlan& plan) {
    long long pictures = 0, channels = 0;
    for (const PlannedStream& s : plan.streams)
        (s.isVideo() ? pictures : channels) += s.isVideo() ? s.expected : s.sound.channels;
    if (form_.kind == OutputKind::pictures) files_->checkNumbered("png", pictures);
    if (form_.splitChannels) files_->checkNumbered("wav", channels);
    if (form_.kind == OutputKind::pictures || form_.splitChannels ||
        (!form_.isOneFile() && plan.streams.size() > 1) || form_.numbered)
        files_->expectSet();
}

void JobOutputs::checkNames(QvEncodePipe& pipe) {
    hidden_ = files_->hiddenName(extension());
    pipe.setFilename(Any(hidden_.c_str()));
    const Any names = pipe.getMuxer()->QvCodec::getParam("filenames");
    for (int i = 0; names.isVector() && i < names.asVector().size(); ++i) {
        const std::string written = names.asVector().at(i).asString();
        // Pictures get numbers in place of this name, and those have been looked at.
        if (form_.kind == OutputKind::pictures && !written.ends_with(".wav")) continue;
        const auto name = finalName(written);
        files_->checkFinal(name);
        if (!places_.insert(files_->placeOf(name)).second)
            throw failure(Msg::outputTwice, {name, "give -o the extension of its format"});
    }
    places_.insert(files_->placeOf(files_->output()));
}

// That nothing else of the job goes there.
void JobOutputs::claimPlace(const std::string& place, const std::string& name) {
    if (files_ && place == files_->placeOf(files_->output())) throw failure(Msg::outputIsOutput, {name});
    const bool numbered = files_ && ((form_.kind == OutputKind::pictures && files_->numbers(place, "png")) ||
                                     (form_.splitChannels && files_->numbers(place, "wav")));
    if (numbered || !places_.insert(place).second)
        throw failure(Msg::outputTwice, {name, "give one of them another name"});
}

std::unique_ptr<Outputs> JobOutputs::makeFile(const std::string& name, const std::string& option) const {
    return std::make_unique<Outputs>(name, option, inputs_, options_.policy, transaction_);
}

void JobOutputs::claimFilterFiles(const std::vector<FilterFiles::Written>& written) {
    for (const auto& [file, filter] : written) {
        // Of the null device there is always one more.
        if (const auto stream = file == "-" ? nullptr : StreamOutput::find(file, inputs_)) {
            if (!stream->discards()) claimPlace(stream->place(), file);
            continue;
        }
        auto output = makeFile(file, "--filter " + filter);
        claimPlace(output->placeOf(file), file);
        dumps_[file] = std::move(output);
    }
}

void JobOutputs::claimTask() {
    const std::string& name = options_.saveTask;
    if (name.empty()) return;
    taskStream_ = StreamOutput::find(name, inputs_);
    if (!taskStream_) {
        taskFile_ = makeFile(name, "--save-task");
        return claimPlace(taskFile_->placeOf(name), name);
    }
    if (taskStream_->isStandardOutput() && options_.dryRun) throw failure(Msg::planAndTask, {name});
    if (!taskStream_->discards()) claimPlace(taskStream_->place(), name);
}

std::string JobOutputs::storedName() const {
    return files_ ? files_->output().string() : stream_ ? stream_->engineName() : "";
}

std::string JobOutputs::begin() {
    if (!files_) return storedName();
    return hidden_ = files_->begin(extension());
}

long long JobOutputs::freeSpace() const {
    return files_ ? QvFile::freeSpace(Any(files_->hiddenName(extension()).c_str())) : -1;
}

FiltersState JobOutputs::begun(FiltersState filters) {
    changeFilterFiles(filters, [&](const std::string& file, const char*, bool writes) {
        const auto dump = writes ? dumps_.find(file) : dumps_.end();
        return dump == dumps_.end() ? file : dump->second->begin("");
    });
    return filters;
}

// The engine has a name for the standard output, which it writes where it stands.
std::string JobOutputs::beginTask() {
    if (taskFile_) return taskFile_->begin("xml");
    return taskStream_->isStandardOutput() ? "stdout" : taskStream_->engineName();
}

void JobOutputs::commitTask() {
    if (taskFile_) taskFile_->commit();
}

void JobOutputs::commit() {
    std::vector<Outputs*> all;
    for (Outputs* const one : {files_.get(), taskFile_.get()})
        if (one) all.push_back(one);
    for (auto& [name, dump] : dumps_) all.push_back(dump.get());
    Outputs::commit(all);
}

std::vector<std::string> JobOutputs::names() const {
    if (files_) return files_->names();
    return stream_ ? std::vector{stream_->name()} : std::vector<std::string>();
}

std::string JobOutputs::finalName(const std::filesystem::path& written) const {
    return files_->finalName(written, extension());
}

std::string JobOutputs::withFinalNames(std::string text) const {
    if (stream_) text = stream_->withUserName(text);
    // The first file has the user's own extension.
    for (size_t at = 0; !hidden_.empty() && (at = text.find(hidden_, at)) != std::string::npos;
         at += form_.name.size())
        text.replace(at, hidden_.size(), form_.name);
    if (files_) text = files_->withFinalNames(std::move(text));
    if (taskFile_) text = taskFile_->withFinalNames(std::move(text));
    for (const auto& [name, dump] : dumps_) text = dump->withFinalNames(std::move(text));
    return text;
}
