#pragma once

// A program started with stdin, stdout or stderr closed would hand those
// numbers to the first files it opens, and the next warning written to
// "stderr" would land in one of them. Opens /dev/null on each of 0, 1 and 2
// that is closed; call first thing in main().
void openMissingStandardDescriptors();
