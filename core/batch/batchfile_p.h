// The file of a batch list: an XML document of type "BatchList" whose dictionary has the tasks as a vector
// under "taskList".
#pragma once

class Any;
class AnyDict;
class AnyVector;

// Writes the dictionary of a list: 0, or QvStatus::failed with lines in the debug log. A file that exists is
// replaced in one step, so that a full disc does not cost the list that is there.
int qvWriteBatchFile(const Any& file, const AnyDict& list);

// Reads the tasks: 0, QvStatus::cannotParse or QvStatus::failed, with a line in the debug log. An element
// that is no dictionary makes the whole file a failure; what a dictionary holds is checked when it is run.
// Encoders that are not installed are replaced by their substitutes.
int qvReadBatchFile(const Any& file, AnyVector& tasks);
