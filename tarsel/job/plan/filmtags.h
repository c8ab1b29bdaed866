// Metadata of films for an output: texts, chapters, timecode.
//
// They come from the input of the first stream. A cut moves chapters and timecode; the chapter in which it
// lies starts with the cut. If inputs follow each other, the output has the texts that are equal in all of
// them, the timecode of the first, and the chapters of all. If any of them has chapters, each input starts
// with one, which has the input's title or name if it has no own.
#pragma once

#include <vector>

#include "tarsel/job/plan/jobplan.h"

// In the form of a decoder's "meta", see the plug-in conventions. `parts`: plans of segments, one after the
// other. Throws Failure for invalid tags in the options.
AnyDict filmTags(const std::vector<const JobPlan*>& parts, const TagOptions& options);

// Sets languages and titles of the streams, from their inputs and the options. Throws Failure for an invalid
// language code, and for more codes than sounds.
void planLanguages(std::vector<PlannedStream>& streams, const TagOptions& options);

// Throws Failure for tags that the output can't hold.
void checkTags(const OutputForm& output, const TagOptions& options);

// "title 'A', 3 chapters, timecode '10:00:00:00'"; empty for none.
std::string tagsText(const AnyDict& tags);
