# The same doors as ./run, for those whose fingers type make.
COMMANDS := $(shell ./run commands)

.DEFAULT_GOAL := help
.PHONY: $(COMMANDS)
$(COMMANDS):
	@./run $@
