/* The switch to the system account and back, call by call as the library makes it. */
#ifndef BENCH_FLOOR_IDENTITY_H_
#define BENCH_FLOOR_IDENTITY_H_

/* From root to the system account; 0 on success. */
int enter_system(void);
/* Back to root; 0 on success. */
int leave_system(void);

#endif /* BENCH_FLOOR_IDENTITY_H_ */
