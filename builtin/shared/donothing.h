// What a multiplexer asks of the sink that it is joined to.
#pragma once

// A multiplexer that writes files of its own sets this parameter of the sink's stream to 1, so that no empty
// file appears.
constexpr char qvSinkDoNothing[] = "doNothing";
