// Weaving of fields, row by row into the frame that leaves.
#pragma once

#include "core/media/qvframe.h"

// The rows of a field in every plane: 0, 2, 4, ... of the top field, 1, 3, 5, ... of the bottom field.
enum class Field { top, bottom };

inline Field otherField(Field field) { return field == Field::top ? Field::bottom : Field::top; }

// Begins a picture of the format and size of `from`, with its metadata and the rows of one field. The other
// rows are undefined. 0, or -3 with `to` empty.
int beginWeave(QvFrame& to, const QvFrame& from, Field field);
// Adds the rows of the other field. -1, with a log line and `to` as it was, if the pictures differ in format
// or size. The metadata stay.
int endWeave(QvFrame& to, const QvFrame& from, Field field);
// The pixels of both fields, without metadata. 0, or -3 with `to` empty.
int copyFields(QvFrame& to, const QvFrame& from);

// Bytes of a row and number of rows that two frames of one shape have in common; 0 rows of a plane without
// any.
struct RowShape {
    std::ptrdiff_t bytes = 0;
    int rows = 0;
};
RowShape commonRows(const QvFrame& a, const QvFrame& b, int plane);
bool sameShape(const QvFrame& a, const QvFrame& b);
