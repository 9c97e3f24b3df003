// Catalog (to be written).
