// Everything that can be asked of a model, damaged or not.
#pragma once

class LUXModelView;

namespace tests {

/// Asks, and aborts the process where an answer reaches outside of what there is.
void useModel(const LUXModelView& view);

}  // namespace tests
