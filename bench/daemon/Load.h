// Many clients of the real daemon at once.
#pragma once

/// Starts a bus and, by it, the daemon; has `clientCount` clients search it for `seconds`, one
/// search after the other each, while books come, change and go; prints a table of what that gave.
/// Returns false, having said why, when something went wrong.
bool measureLoad(int clientCount, double seconds);
