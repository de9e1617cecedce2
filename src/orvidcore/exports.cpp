// SPDX-License-Identifier: MIT
// The shared library consists of the objects of the static one; exports.map says what it shows.
