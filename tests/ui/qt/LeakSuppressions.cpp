// Under AddressSanitizer's leak check, what Qt and fontconfig allocate for
// their own caches and keep for the life of the process counts as leaked.
// Only stacks inside those libraries are excused; the hook is read by the
// sanitizer at start and does nothing in other builds.

extern "C" const char* __lsan_default_suppressions() {
  return "leak:libQt6Core.so\n"
         "leak:libQt6Gui.so\n"
         "leak:libQt6Widgets.so\n"
         "leak:libfontconfig.so\n";
}
