/* What a login asks and tells auto-block, whose file is opened for each. */
#ifndef BENCH_FLOOR_AUTO_BLOCK_H_
#define BENCH_FLOOR_AUTO_BLOCK_H_

/* Whether the visitor's address is denied; 0 on success. */
int ask_auto_block(void);
/* Forgets the address's failures; 0 on success. */
int reset_auto_block(void);

#endif /* BENCH_FLOOR_AUTO_BLOCK_H_ */
