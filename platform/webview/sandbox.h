#pragma once

// Whether bubblewrap can put a process into a sandbox as the engine wants it, and the proxy of its bus is there. Starts
// one; some hundredths of a second. Any thread.
bool sandbox_works();
