# The commands of ./run, for those who type make.
COMMANDS := $(shell ./run commands)

.DEFAULT_GOAL := help
.PHONY: $(COMMANDS)
$(COMMANDS):
	@./run $@
