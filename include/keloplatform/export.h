#pragma once

// Marks what a platform library shows; everything else in it is hidden.
#define KELOPLATFORM_API __attribute__((visibility("default")))
