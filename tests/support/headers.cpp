// Nothing: the headers that tests share are precompiled for this file.
