#pragma once

// Sets up how a start writes its warnings: each in one piece, and none may end the start halfway.
// Prints and throws nothing.
void prepare_warnings();
