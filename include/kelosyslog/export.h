#pragma once

// Marks what libkelosyslog shows; everything else in it is hidden.
#define KELOSYSLOG_API __attribute__((visibility("default")))

// Hides a member of a class that is shown.
#define KELOSYSLOG_LOCAL __attribute__((visibility("hidden")))
