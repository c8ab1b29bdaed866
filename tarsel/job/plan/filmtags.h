// What films say of themselves, on its way into an output: texts, chapters, timecode.
//
// The first stream's input is what the output is of. A cut moves chapters and timecode; the chapter that is
// under way there begins with it. Of inputs that follow each other the output has the texts that all have
// alike, the timecode of the first, and the chapters of all. Where any of them has chapters, each begins with
// one, of its own title or its name.
#pragma once

#include <vector>

#include "tarsel/job/plan/jobplan.h"

// In the form of a decoder's "meta", see the plug-in conventions. `parts`: plans of segments, one after the
// other. Throws Failure for tags that the options give wrongly.
AnyDict filmTags(const std::vector<const JobPlan*>& parts, const TagOptions& options);

// Languages and titles of the streams, from their inputs and the options. Throws Failure for a language that
// is none, or that no sound is there for.
void planLanguages(std::vector<PlannedStream>& streams, const TagOptions& options);

// Throws Failure for tags that are asked of an output without room for any.
void checkTags(const OutputForm& output, const TagOptions& options);

// "title 'A', 3 chapters, timecode '10:00:00:00'"; empty for none.
std::string tagsText(const AnyDict& tags);
