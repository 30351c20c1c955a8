// Has no code: the target that owns GoogleTest's precompiled header needs a source.
