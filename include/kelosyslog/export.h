#pragma once

// Marks what libkelosyslog shows; everything else in it is hidden.
#define KELOSYSLOG_API __attribute__((visibility("default")))
