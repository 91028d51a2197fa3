// Parameter lists of INPUTS_NUM images; each element brings the comma in front of it.

#define MAX_INPUTS_NUM 6
#if INPUTS_NUM > MAX_INPUTS_NUM
#error Internal error: too lot of inputs!
#endif

#define input(itr) , srcBufferType(input##itr)
#define IMAGE_ARRAY(name, num) REPEAT(num, name)

