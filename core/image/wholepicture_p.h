// Pictures that are drawn whole or not at all.
#pragma once

class Any;
class QvFrame;

// QvImage::loadFrame that refuses a damaged image, also with QvStatus::cannotParse and a warning in the user
// log; the frames then hold what could be read.
int qvLoadWhole(QvFrame& picture, const Any& path, QvFrame* alpha);
