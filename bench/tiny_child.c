/* The child of the launch benchmark: a compiled program that does nothing and
 * ends at once, so that what is measured around it is the cost of starting a
 * process, and (when started through the launcher) the launcher's own work. */
int main(void) { return 0; }
