// The client's look: one compiled file of layouts and icons, loaded over the toolkit's theme, and the light
// or dark palette. Main loop only.
#pragma once

// Load the layouts once, before the first window. Where the file is missing or broken the toolkit's default
// look stays, and the log has Edje's own error text. The dark palette is used when the preference
// "tavro_theme" is "dark".
bool tavro_theme_load();

// Path of the layout file; valid for the process lifetime.
const char *tavro_theme_file();

// The palette's red as "#rrggbb", for texts that carry their colour.
const char *tavro_theme_danger_colour();
