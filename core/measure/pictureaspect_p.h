// The shape of a pixel from the shape of the picture, and back: what QvUtil's functions of these names do.
#pragma once

int qvPixelAspect(int& x, int& y, double frameAspect, int width, int height, bool broadcast);
double qvFrameAspect(int x, int y, int width, int height, bool broadcast);
