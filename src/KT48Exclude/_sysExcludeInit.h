// The system objects that are created once per boot rather than lazily.
#ifndef KT48_SYSEXCLUDEINIT_H
#define KT48_SYSEXCLUDEINIT_H

// Creates them in their order (each family adds its system hook here);
// 0, or the first failing hook's result.
int Exclude_CreateSystemObjects();

#endif
