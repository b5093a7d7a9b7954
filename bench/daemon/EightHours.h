// The daemon's service over many hours.
#pragma once

/// Runs the service in this process, on a simulated clock, for so many hours, with books that come,
/// change and go every minute and clients that search; prints its memory at the end of each hour.
/// Returns false, having said why, when something went wrong.
bool measureHours(int hours);
