#pragma once

#include "b_containers.h"
#include "b_types.h"

namespace host {

/// A bar on the last line of the terminal behind the standard error stream. Without a terminal it
/// does nothing. The line must be erased before anything else is printed.
class ProgressBar {
public:
    /// `wanted` false switches the bar off.
    explicit ProgressBar(bool wanted);

    /// Draws the bar in the place of the one before.
    void draw(base::u32 percent, base::string_view text);
    /// Takes the line away; `redraw` brings it back.
    void erase();
    void redraw();
    /// Takes the line away for good.
    void end();

private:
    bool active_;
    base::string line_; ///< empty while no task is under way
};

} // namespace host
