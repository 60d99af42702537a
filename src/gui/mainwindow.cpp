// Placeholder: filled as the part lands.
