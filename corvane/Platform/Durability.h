#pragma once

namespace corvane {

/// What everything must survive that was acknowledged.
enum class Durability {
    /// The death of the process at any moment. The system writes to the disk when it sees fit, so that a power cut, or
    /// a crash of the system, may lose the last moments: on Linux up to 41 seconds unless it is set otherwise.
    processKill,
    /// A power cut at any moment, too. Whoever acknowledges waits for the disk.
    powerCut,
};

}  // namespace corvane
