// libgepub 0.7.0 includes this name from its own build.
