// SPDX-License-Identifier: Apache-2.0
#pragma once

/// The version of these headers. The build takes the project's version from here.
#define QUILT_VERSION_MAJOR 0
#define QUILT_VERSION_MINOR 1
#define QUILT_VERSION_PATCH 0

/// "0.1.0".
#define QUILT_VERSION "0.1.0"

/// One number to compare by the preprocessor: `#if QUILT_VERSION_NUMBER >= QUILT_MAKE_VERSION(0, 2, 0)`.
#define QUILT_MAKE_VERSION(major, minor, patch) ((major)*1000000 + (minor)*1000 + (patch))
#define QUILT_VERSION_NUMBER QUILT_MAKE_VERSION(QUILT_VERSION_MAJOR, QUILT_VERSION_MINOR, QUILT_VERSION_PATCH)
