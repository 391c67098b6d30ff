#pragma once

namespace scene {

/// The parameter in 0 to 1 at which a segment's time axis reaches `elapsed` seconds after the
/// segment's start. The axis is a Bezier cubic from 0 to `duration` whose control abscissae lie
/// `startReach` after the start and `endReach` before the end. 0 if there is no such parameter.
double findCurveParameter(double elapsed, double duration, double startReach, double endReach);

} // namespace scene
