// A test picture.
#ifndef TARNWICK_TOOLS_TWCAMSIM_PICTURE_H_
#define TARNWICK_TOOLS_TWCAMSIM_PICTURE_H_

#include <string>

// A grey JPEG (baseline) of `columns` by `rows` squares of 8 pixels: a bar that moves on by a
// square from frame to frame.
std::string TestPicture(int columns, int rows, int frame);

#endif  // TARNWICK_TOOLS_TWCAMSIM_PICTURE_H_
