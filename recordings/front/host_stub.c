// Stands for a library of the host while the recorder is linked; nothing of it is used.
void recorder_stands_for_a_host(void);
void recorder_stands_for_a_host(void) {}
