"""A generator of random C programs: loops, sums of products, pointer walks and the like."""
