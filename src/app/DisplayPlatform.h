#pragma once

// With no display at all (no DISPLAY, no WAYLAND_DISPLAY) and no platform
// chosen by the user, Qt would abort at start-up; a bridge must keep running
// headless, so pick the offscreen platform before QApplication exists. A
// headless program also gets Qt's own event loop instead of GLib's.
void chooseOffscreenPlatformWhenHeadless();
