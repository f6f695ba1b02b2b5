// The private section of I_FILE; included inside the class and nowhere else.
