# SPDX-License-Identifier: Apache-2.0
"""What scripts/make-sample-data.py makes, a module for each subject."""
