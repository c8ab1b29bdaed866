// Weaving of fields, row by row into the frame that leaves.
#pragma once

class QvFrame;

// The rows of a field in every plane: 0, 2, 4, ... of the top field, 1, 3, 5, ... of the bottom field.
enum class Field { top, bottom };

inline Field otherField(Field field) { return field == Field::top ? Field::bottom : Field::top; }

// Begins a picture of the format and size of `from`, with its metadata and the rows of one field. The other
// rows are undefined. 0, or -3 with `to` empty.
int beginWeave(QvFrame& to, const QvFrame& from, Field field);
// Adds the rows of the other field. -1, with a log line and `to` as it was, if the pictures differ in format
// or size. The metadata stay.
int endWeave(QvFrame& to, const QvFrame& from, Field field);
