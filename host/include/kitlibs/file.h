/// @file
/// What is at a path.

#pragma once

/// True when something exists at `path`; links are followed. Never throws.
__attribute__((visibility("default"))) bool File_Exists(const char* path);

/// True when `path` is a directory; links are followed. Never throws.
__attribute__((visibility("default"))) bool File_IsDirectory(const char* path);
